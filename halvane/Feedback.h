#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>

#include "base/Namespace.h"

namespace zelkor {

class RecordReader;

// Every kind of feedback. Both families of a kind ("HV…" of the search model, "CZ…" of the
// messages) are one record.
enum class FeedbackKind : std::uint8_t {
  VisibleResults,
  StartNetworkSearch,
  LookupStartNetworkSearch,
  EndNetworkSearch,
  ZelkorEndNetworkSearch,
  StartLocalSearch,
  EndLocalSearch,
  SearchViewAppear,
  SearchViewDisappear,
  Ranking,
  Ranker,
  ResultEngagement,
  CardSectionEngagement,
  MapsCardSectionEngagement,
  StoreCardSectionEngagement,
  Error,
  SuggestionEngagement,
  CardViewDisappear,
  StartSearch,
  EndSearch,
  VisibleSuggestions,
  Custom,
  ResultsReceivedAfterTimeout,
  LateSectionsAppended,
  ClearInput,
  SessionEnd,
  SkipSearch,
  CacheHit,
  SectionEngagement,
  VisibleSectionHeader,
  SessionMissingResults,
  SessionMissingSuggestions,
  DidGoToSite,
  DidGoToSearch,
  ConnectionInvalidated,
  ResultGrading,
};
inline constexpr std::size_t kFeedbackKinds =
    static_cast<std::size_t>(FeedbackKind::ResultGrading) + 1;

// Which of its two names a record goes by. The records are alike; a few keys are sent for one
// family only.
enum class FeedbackFamily : std::uint8_t { Model, Message };

// A record of something that happened in a search. Immutable once it is shared.
struct HVFeedback {
  HVFeedback() = default;
  HVFeedback(const HVFeedback&) = default;
  HVFeedback& operator=(const HVFeedback&) = default;
  virtual ~HVFeedback() = default;

  virtual FeedbackKind kind() const = 0;
  // The class's name, such as "HVErrorFeedback"; for the message family "CZErrorFeedback".
  virtual std::string_view className() const = 0;
  virtual std::unique_ptr<HVFeedback> clone() const = 0;
  // Appends the record's message (protocol buffers, proto3).
  virtual void appendTo(std::string& bytes) const = 0;
  // Bytes of that message.
  virtual std::size_t messageSize() const = 0;
  // Takes over what a message says. False when it does not parse; the reader knows why.
  virtual bool read(RecordReader& reader) = 0;

  std::uint64_t timestamp = 0;  // boot-time nanoseconds; 0: set when it is recorded
  FeedbackFamily family = FeedbackFamily::Model;
};

}  // namespace zelkor
