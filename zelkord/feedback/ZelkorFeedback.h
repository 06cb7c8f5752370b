#pragma once

#include <array>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "base/Json.h"
#include "base/UUID.h"
#include "halvane/Feedback.h"
#include "platform/api/Clock.h"
#include "zelkord/ZelkorLogging/ZelkorLogging.h"
#include "zelkord/assembly/ZelkorDiagnosticDataReporter.h"
#include "zelkord/encoding/IdentifierProcessor.h"
#include "zelkord/feedback/SharedText.h"

namespace zelkord {

// One feedback record on its way through a session: what happened, for which query, and who said
// so. The user identifier and the user agent are not stored with it; reading restores them from the
// session's header.
//
// Threading: a value; the feedback itself is immutable.
struct ZelkorFeedback {
  std::shared_ptr<const HVFeedback> feedback;
  std::int64_t queryId = 0;
  std::optional<UUID> userGuid;
  SharedText userAgent;
  std::uint64_t clientQueryId = 0;
  std::uint64_t relTimestamp = 0;  // milliseconds since the session's first record
  std::int64_t pid = 0;            // of the client that caused it; 0 for the daemon's own
  // What it holds on to until it is written, or dropped: of a budget, of the call that brought it.
  std::shared_ptr<const void> held = nullptr;

  // The feedback's: an index into eventTypes().
  std::uint32_t type() const;
  // Prepares the feedback's identifiers for sending.
  void process(IdentifierProcessor& processor);

  // Appends what is sent, a JSON object. False, with `text` as it was, when JSON cannot express the
  // record.
  bool appendDictionary(const Logger& errors, std::string& text) const;
  // The same as a value; empty when JSON cannot express it.
  json::object dictionary(const Logger& errors) const;
  // For logs and live streams: like `dictionary`, with the feedback's own timestamp in
  // milliseconds. None when JSON cannot express it, which is counted as a record not sent.
  std::optional<std::string> description(const Logger& errors,
                                         const ZelkorDiagnosticDataReporter& reporter) const;
};

// The holder of what the record takes of budgets.
std::string feedbackHolder(const ZelkorFeedback& record);

// Names of the feedback types, by type.
const std::array<std::string_view, 35>& eventTypes();
// Requires type < 35.
std::string_view eventTypeToString(std::uint32_t type);

// Orders records by the timestamps of their feedback: negative, zero or positive.
int timeStampComparator(const ZelkorFeedback& a, const ZelkorFeedback& b);

// Gives feedback that has no timestamp the time of now.
void stamp(ZelkorFeedback& record, const Clock& clock);

// Durations of the clock that stamps feedback, in whole milliseconds.
std::uint64_t millisecondsOf(std::uint64_t nanoseconds);

// The name of a stream of feedback: 1 "Feedbacks", 0 "crowdsourcing", else "".
std::string_view convertIdentifierToString(std::int64_t identifier);

inline constexpr std::string_view kFeedbackSent = "com.quenta.zelkord.feedbacksent";
inline constexpr std::string_view kFeedbackNotSent = "com.quenta.zelkord.feedbacknotsent";

}  // namespace zelkord
