#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "zelkord/feedback/ZelkorFeedback.h"

namespace zelkord {

class UserGUIDSource;

// Decides which feedback session a record belongs to. One for all clients, or one a client.
//
// Threading: any thread; recording never waits.
class SessionManager {
 public:
  virtual ~SessionManager() = default;
  // False when too much waits to be written: the record is dropped.
  virtual bool addZelkorFeedback(ZelkorFeedback feedback) = 0;
  // Ends the current session; the call-back, when given, runs once that is done, on any thread.
  virtual void flushSession(std::function<void()> callback) = 0;
  // The connection of a client in that process went away; the flag says whether a session was ended
  // for it.
  virtual void flushSessionInvalidation(std::optional<std::string> agent, std::int64_t process,
                                        std::function<void(bool flushed)> callback) = 0;
  // The current session's records in memory as JSON texts, oldest first: none in normal operation.
  virtual std::vector<std::string> feedbacksWithRelativeTimestamp() = 0;
  // Returns when everything added so far has been handed to the storage.
  virtual void waitForPendingFeedback() = 0;
  virtual const std::string& identifier() const = 0;
};

// A session made for one occasion, such as a fetch: it begins with its first record.
// Threading: any thread.
class FeedbackSession {
 public:
  virtual ~FeedbackSession() = default;
  virtual void addFeedback(ZelkorFeedback feedback) = 0;
  // No record follows.
  virtual void sessionComplete() = 0;
};

// Makes managers and sessions.
class FeedbackSessions {
 public:
  virtual ~FeedbackSessions() = default;
  // Records get the user identifier that `guidController` has at the moment.
  virtual std::shared_ptr<SessionManager> makeManager(
      std::string identifier, std::shared_ptr<UserGUIDSource> guidController) = 0;
  // Null when there are too many, or too much waits to be written: the record is dropped.
  virtual std::shared_ptr<FeedbackSession> makeSession(ZelkorFeedback first) = 0;
};

}  // namespace zelkord
