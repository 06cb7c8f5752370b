#include "zelkord/encoding/Encoders.h"

#include <algorithm>
#include <array>

#include "base/Json.h"

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

bool isOfOutsideEngine(const HVSearchResult& result) {
  const auto type = result.resultType.value;
  return type >= kFirstOutsideEngine && type <= kLastOutsideEngine;
}

// The result of an engagement, as an object.
void appendEngagedResult(const HVResultEngagementFeedback& feedback, std::string& text) {
  const auto& result = *feedback.result;
  text += '{';
  const auto begin = text.size();
  appendMember("id", result.identifier, begin, text);
  if (isOfOutsideEngine(result) && (result.hasTitle || result.title)) {
    appendMember("third_party_suggestion", result.title, begin, text);
  }
  appendMember("action_destination", actionDestinationFromResult(result, feedback.actionEngaged),
               begin, text);
  text += '}';
}

// Members that every record sets by itself.
constexpr std::array<std::string_view, 4> kOwnMembers = {"query_id", "client_query_id", "type",
                                                         "timestamp"};

// Takes our members out of a client's object; false when there were none.
bool removeOwnMembers(json::object& object) {
  const auto old = object.size();
  for (const auto key : kOwnMembers) {
    const auto found = object.find(key);
    if (found != object.end()) object.stable_erase(found);
  }
  return object.size() != old;
}

// What stands between the braces of an object's text.
std::string_view insideBraces(std::string_view object) {
  const auto first = object.find('{');
  const auto last = object.rfind('}');
  auto inside = object.substr(first + 1, last - first - 1);
  constexpr std::string_view kSpace = " \t\r\n";
  const auto begin = inside.find_first_not_of(kSpace);
  if (begin == std::string_view::npos) return {};
  return inside.substr(begin, inside.find_last_not_of(kSpace) - begin + 1);
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
  appendEngagedResult(feedback, text);
  if (feedback.actionEngaged) appendMember("action_target", feedback.actionTarget, begin, text);
  return true;
}

bool appendMembersOf(const HVMapsCardSectionEngagementFeedback& feedback, std::size_t begin,
                     std::string& text) {
  return appendMember("trigger_event", std::string("tap"), begin, text) &&
         appendMember("card_type", std::string("maps"), begin, text) &&
         appendMember("action_target", feedback.feedbackType, begin, text);
}

bool appendMembersOf(const HVStoreCardSectionEngagementFeedback& feedback, std::size_t begin,
                     std::string& text) {
  return appendMember("trigger_event", std::string("tap"), begin, text) &&
         appendMember("card_type", std::string("tunevo_sheet"), begin, text) &&
         appendMember("action_target", feedback.productPageResult, begin, text);
}

bool appendMembersOf(const HVSuggestionEngagementFeedback& feedback, std::size_t begin,
                     std::string& text) {
  const auto& suggestion = feedback.suggestion;
  return appendMember("id", suggestion ? suggestion->identifier : std::nullopt, begin, text);
}

bool appendMembersOf(const HVCustomFeedback& feedback, std::size_t begin, std::string& text) {
  const auto& json = feedback.jsonFeedback;
  auto parsed = parseJson(json);
  auto* object = parsed ? parsed->if_object() : nullptr;
  if (!object) return false;
  const bool hasOwn = removeOwnMembers(*object);
  const auto changed = hasOwn ? json::serialize(*object) : std::string();
  const auto members = insideBraces(hasOwn ? changed : json);
  if (members.empty()) return true;
  if (text.size() > begin) text += ',';
  text += members;
  return true;
}

bool appendMembersOf(const HVResultGradingFeedback& feedback, std::size_t begin,
                     std::string& text) {
  if (!appendFields(feedback, begin, text)) return false;
  return feedback.family != FeedbackFamily::Message ||
         appendMember("text_feedback", feedback.textFeedback, begin, text);
}

}  // namespace zelkord
