#pragma once

#include <string>

#include "halvane/DaemonFeedback.h"
#include "halvane/ModelFeedback.h"
#include "zelkord/encoding/JsonWriting.h"
#include "zelkord/encoding/ObjectMembers.h"

namespace zelkord {

// The members of what is sent of a record: its fields as it describes them, unless its kind is one
// of those below.
template <typename T>
bool appendMembersOf(const T& feedback, std::size_t begin, std::string& text) {
  return appendFields(feedback, begin, text);
}

bool appendMembersOf(const HVResultEngagementFeedback& feedback, std::size_t begin,
                     std::string& text);
bool appendMembersOf(const HVMapsCardSectionEngagementFeedback& feedback, std::size_t begin,
                     std::string& text);
bool appendMembersOf(const HVStoreCardSectionEngagementFeedback& feedback, std::size_t begin,
                     std::string& text);
bool appendMembersOf(const HVSuggestionEngagementFeedback& feedback, std::size_t begin,
                     std::string& text);
bool appendMembersOf(const HVCustomFeedback& feedback, LeftOut leftOut, std::size_t begin,
                     std::string& text);
bool appendMembersOf(const HVResultGradingFeedback& feedback, std::size_t begin, std::string& text);
// Where an engagement led to: the address that the service's own results name, null when they name
// none; "non_zelkor_result" for all others.
std::optional<std::string> actionDestinationFromResult(const HVSearchResult& result,
                                                       bool actionEngaged);

}  // namespace zelkord
