#pragma once

#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "base/UUID.h"
#include "zelkord/feedback/ZelkorFeedback.h"

namespace zelkord {

class ClientSession;

// The open session of a session manager: one, or one for each user agent.
//
// Threading: any thread; records are kept in the order in which they are added.
class SessionRecords {
 public:
  using Visitor = std::function<void(ClientSession& session, bool isLast)>;

  virtual ~SessionRecords() = default;
  virtual std::optional<UUID> userGuid() const = 0;
  virtual void addFeedback(ZelkorFeedback feedback) = 0;
  // Visits each session before it returns.
  virtual void enumerateSessions(const Visitor& visitor) = 0;
  // The records in memory, by their timestamps: none in normal operation.
  virtual std::vector<ZelkorFeedback> getSessionFeedbacks() = 0;
  // The same as JSON texts, with timestamps in milliseconds since the first.
  virtual std::vector<std::string> feedbacksWithRelativeTimestamp() = 0;
  // What is sent of the records in memory, as JSON texts: identifiers replaced, missing
  // suggestions and results first.
  virtual std::vector<std::string> privacyFilteredFeedbacksWithRelativeTimestamp() = 0;
};

}  // namespace zelkord
