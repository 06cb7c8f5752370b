#include "zelkord/feedback/ZelkorFeedback.h"

#include "base/Check.h"
#include "halvane/DaemonFeedback.h"
#include "halvane/ModelFeedback.h"
#include "halvane/Vocabulary.h"
#include "platform/api/Budget.h"
#include "zelkord/encoding/FeedbackEncoding.h"
#include "zelkord/encoding/JsonWriting.h"

namespace zelkord {
namespace {

constexpr std::array<std::string_view, 35> kFeedbackTypeNames = {
    "visible_results",
    "network_search_start",
    "network_search_end",
    "local_search_start",
    "local_search_end",
    "search_view_appear",
    "search_view_disappear",
    "rank_sections",
    "result_engagement",
    "visible_card",
    "card_engagement",
    "error",
    "suggestion_engagement",
    "card_view_disappear",
    "search_start",
    "search_end",
    "visible_suggestions",
    "custom_unknown",
    "custom_crowdsourcing",
    "custom_brelin_autofill",
    "custom_lanthe_result_features",
    "unknown",
    "results_received_after_timeout",
    "late_sections_appended",
    "clear_input",
    "session_end",
    "skip_zelkor_search",
    "section_engagement",
    "visible_section_header",
    "session_missing_results",
    "session_missing_suggestions",
    "did_go_to_site",
    "connection_invalidated",
    "result_grade",
    "did_go_to_search",
};

template <typename... Kinds>
constexpr bool haveNames(FeedbackList<Kinds...>) {
  return ((Kinds::kDescription.type < kFeedbackTypeNames.size()) && ...);
}
static_assert(haveNames(FeedbackKinds()), "every type has its name");

// Members that a record sets over the feedback's own.
constexpr std::array<std::string_view, 4> kSetMembers = {"type", "timestamp", "query_id",
                                                         "client_query_id"};

LeftOut membersSetBy(const ZelkorFeedback& record) {
  const LeftOut all = kSetMembers;
  if (!record.feedback->requiresQueryId()) return all.first(2);
  return all.first(record.clientQueryId != 0 ? 4 : 3);
}

// The record with that timestamp, as an object.
bool appendObject(const ZelkorFeedback& record, std::uint64_t timestamp, const Logger& errors,
                  std::string& text) {
  const auto old = text.size();
  text += '{';
  const auto begin = text.size();
  if (!appendMembers(*record.feedback, errors, begin, text, membersSetBy(record))) {
    text.resize(old);
    return false;
  }
  if (record.feedback->requiresQueryId()) {
    appendJsonKey("query_id", begin, text);
    appendJsonInteger(record.queryId, text);
    if (record.clientQueryId != 0) {
      appendJsonKey("client_query_id", begin, text);
      appendJsonInteger(record.clientQueryId, text);
    }
  }
  appendJsonKey("type", begin, text);
  appendJsonString(eventTypeToString(record.type()), text);
  appendJsonKey("timestamp", begin, text);
  appendJsonInteger(timestamp, text);
  text += '}';
  return true;
}

}  // namespace

std::uint32_t ZelkorFeedback::type() const { return feedback->type(); }

void ZelkorFeedback::process(IdentifierProcessor& processor) {
  feedback = processed(std::move(feedback), processor);
}

bool ZelkorFeedback::appendDictionary(const Logger& errors, std::string& text) const {
  return appendObject(*this, relTimestamp, errors, text);
}

json::object ZelkorFeedback::dictionary(const Logger& errors) const {
  std::string text;
  if (!appendDictionary(errors, text)) return {};
  return valueOfOwnJson(text).as_object();
}

std::optional<std::string> ZelkorFeedback::description(
    const Logger& errors, const ZelkorDiagnosticDataReporter& reporter) const {
  std::string text;
  if (appendObject(*this, millisecondsOf(feedback->timestamp), errors, text)) return text;
  reporter.addValue(1, kFeedbackNotSent);
  return std::nullopt;
}

void stamp(ZelkorFeedback& record, const Clock& clock) {
  if (!record.feedback || record.feedback->timestamp != 0) return;
  const std::shared_ptr<HVFeedback> stamped = record.feedback->clone();
  stamped->timestamp = static_cast<std::uint64_t>(clock.now().time_since_epoch().count());
  record.feedback = stamped;
}

std::string feedbackHolder(const ZelkorFeedback& record) {
  return record.pid == 0 ? "zelkord" : processHolder(record.pid);
}

std::uint64_t millisecondsOf(std::uint64_t nanoseconds) { return nanoseconds / 1'000'000; }

const std::array<std::string_view, 35>& eventTypes() { return kFeedbackTypeNames; }

std::string_view eventTypeToString(std::uint32_t type) { return entryOf(eventTypes(), type); }

int timeStampComparator(const ZelkorFeedback& a, const ZelkorFeedback& b) {
  const auto first = a.feedback->timestamp;
  const auto second = b.feedback->timestamp;
  return first == second ? 0 : first > second ? 1 : -1;
}

std::string_view convertIdentifierToString(std::int64_t identifier) {
  if (identifier == 1) return "Feedbacks";
  return identifier == 0 ? "crowdsourcing" : "";
}

}  // namespace zelkord
