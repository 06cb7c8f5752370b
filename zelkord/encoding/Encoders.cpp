#include "zelkord/encoding/Encoders.h"

#include "base/Json.h"
#include "zelkord/encoding/ObjectMembers.h"

namespace zelkord {
namespace {

// In the table of result types.
constexpr std::int32_t kOwnResult = 1;
constexpr std::int32_t kFirstOutsideEngine = 9;
constexpr std::int32_t kLastOutsideEngine = 14;

template <typename Value>
bool appendMember(std::string_view key, const Value& value, std::size_t begin, std::string& text) {
  appendJsonKey(key, begin, text);
  return appendJson(value, text);
}

// What somebody did in a card of that type.
template <typename Target>
bool appendTap(const char* cardType, const Target& target, std::size_t begin, std::string& text) {
  return appendMember("trigger_event", std::string("tap"), begin, text) &&
         appendMember("card_type", std::string(cardType), begin, text) &&
         appendMember("action_target", target, begin, text);
}

bool isOfOutsideEngine(const HVSearchResult& result) {
  const auto type = result.resultType.value;
  return type >= kFirstOutsideEngine && type <= kLastOutsideEngine;
}

// The result of an engagement, as an object.
bool appendEngagedResult(const HVResultEngagementFeedback& feedback, std::string& text) {
  const auto result = *feedback.result;
  text += '{';
  const auto begin = text.size();
  bool good = appendMember("id", result.identifier, begin, text);
  if (isOfOutsideEngine(result) && (result.hasTitle || result.title)) {
    good = good && appendMember("third_party_suggestion", result.title, begin, text);
  }
  good = good &&
         appendMember("action_destination",
                      actionDestinationFromResult(result, feedback.actionEngaged), begin, text);
  text += '}';
  return good;
}

}  // namespace

std::optional<std::string> actionDestinationFromResult(const HVSearchResult& result,
                                                       bool actionEngaged) {
  if (result.resultType.value != kOwnResult) return "non_zelkor_result";
  if (!actionEngaged) {
    return result.punchout ? result.punchout->preferredOpenableURL() : std::nullopt;
  }
  const auto& action = result.action;
  return action && action->punchout ? action->punchout->preferredOpenableURL() : std::nullopt;
}

bool appendMembersOf(const HVResultEngagementFeedback& feedback, std::size_t begin,
                     std::string& text) {
  appendMember("trigger_event", feedback.triggerEvent, begin, text);
  appendMember("destination", feedback.destination, begin, text);
  appendJsonKey("result", begin, text);
  if (!feedback.result) {
    text += "null";
    return true;
  }
  if (!appendEngagedResult(feedback, text)) return false;
  return !feedback.actionEngaged ||
         appendMember("action_target", feedback.actionTarget, begin, text);
}

bool appendMembersOf(const HVMapsCardSectionEngagementFeedback& feedback, std::size_t begin,
                     std::string& text) {
  return appendTap("maps", feedback.feedbackType, begin, text);
}

bool appendMembersOf(const HVStoreCardSectionEngagementFeedback& feedback, std::size_t begin,
                     std::string& text) {
  return appendTap("tunevo_sheet", feedback.productPageResult, begin, text);
}

bool appendMembersOf(const HVSuggestionEngagementFeedback& feedback, std::size_t begin,
                     std::string& text) {
  const auto& suggestion = feedback.suggestion;
  return appendMember("id", suggestion ? suggestion->identifier : std::nullopt, begin, text);
}

bool appendMembersOf(const HVCustomFeedback& feedback, LeftOut leftOut, std::size_t begin,
                     std::string& text) {
  if (!isJsonObject(feedback.jsonFeedback)) return false;
  appendMembersOfObject(feedback.jsonFeedback, leftOut, begin, text);
  return true;
}

bool appendMembersOf(const HVResultGradingFeedback& feedback, std::size_t begin,
                     std::string& text) {
  if (!appendFields(feedback, begin, text)) return false;
  return feedback.family != FeedbackFamily::Message ||
         appendMember("text_feedback", feedback.textFeedback, begin, text);
}

}  // namespace zelkord
