#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "zelkord/feedback/ZelkorFeedback.h"

namespace zelkord {

// Decides which feedback session a record belongs to. One for all clients, or one a client.
//
// Threading: any thread; recording never waits.
class SessionManager {
 public:
  virtual ~SessionManager() = default;
  virtual void addZelkorFeedback(ZelkorFeedback feedback) = 0;
  // Ends the current session; the call-back, when given, runs once that is done, on any thread.
  virtual void flushSession(std::function<void()> callback) = 0;
  // A client's connection went away; the flag says whether a session was ended for it.
  virtual void flushSessionInvalidation(std::optional<std::string> agent,
                                        std::function<void(bool flushed)> callback) = 0;
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
  virtual std::shared_ptr<SessionManager> makeManager(std::string identifier) = 0;
  virtual std::shared_ptr<FeedbackSession> makeSession(ZelkorFeedback first) = 0;
};

}  // namespace zelkord
