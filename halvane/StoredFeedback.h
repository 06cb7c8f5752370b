#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <tuple>
#include <vector>

#include "halvane/Feedback.h"
#include "halvane/RecordReader.h"
#include "halvane/Vocabulary.h"

namespace zelkor {

// The messages around feedback, as corezelkor/proto/Feedback.proto has them.

// A feedback with the name of its class. Views: they borrow.
struct CZFeedbackPayload {
  std::string_view feedbackClass;
  std::string_view feedback;  // its message

  static constexpr auto fields() {
    using T = CZFeedbackPayload;
    return std::tuple{stored(1, "feedback_class", &T::feedbackClass),
                      stored(2, "feedback", &T::feedback)};
  }
};

struct CZResourceVersion {
  std::string identifier;
  std::string version;

  static constexpr auto fields() {
    using T = CZResourceVersion;
    return std::tuple{stored(1, "identifier", &T::identifier), stored(2, "version", &T::version)};
  }
};

// What a session says of itself.
struct CZClientSession {
  std::string agent;
  std::string userGuidString;  // canonical, or empty
  Term<vocabulary::kSessionEndReasons> previousSessionEndReason;
  bool removeTimestamps = false;
  std::optional<double> sessionStartSince1970;  // seconds
  bool firstUseOfTheDay = false;
  std::vector<CZResourceVersion> cpResourceVersions;

  static constexpr auto fields() {
    using T = CZClientSession;
    return std::tuple{stored(1, "agent", &T::agent),
                      stored(2, "user_guid_string", &T::userGuidString),
                      stored(3, "previous_session_end_reason", &T::previousSessionEndReason),
                      stored(4, "remove_timestamps", &T::removeTimestamps),
                      stored(5, "session_start_since_1970", &T::sessionStartSince1970),
                      stored(6, "first_use_of_the_day", &T::firstUseOfTheDay),
                      stored(7, "cp_resource_versions", &T::cpResourceVersions)};
  }
};

// One record of a session as it is stored.
struct CZZelkorFeedback {
  std::shared_ptr<const HVFeedback> feedback;
  std::int64_t queryId = 0;
  std::uint64_t clientQueryId = 0;
  std::uint64_t relTimestamp = 0;  // milliseconds
};

// Appends the record's message.
void appendStoredFeedback(const CZZelkorFeedback& record, std::string& bytes);

// The record that a message holds, of any class. None when it does not parse or its class is
// unknown (Malformed), or for another fault.
std::optional<CZZelkorFeedback> readStoredFeedback(std::string_view message, RecordFault& fault);

}  // namespace zelkor
