#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "base/Mutex.h"
#include "platform/api/ProcessTransactions.h"
#include "platform/api/WorkQueue.h"
#include "zelkord/feedback/FeedbackRoom.h"
#include "zelkord/feedback/SessionManager.h"
#include "zelkord/feedback/SessionRecords.h"
#include "zelkord/feedback/SessionTransitions.h"

namespace zelkord {

class Assembly;
class UserGUIDSource;

// Opens feedback sessions, keeps them alive and ends them: the table of SessionTransitions.h with
// the timers and records that raise its events.
//
// A session opens with a record. 600 s later its soft limit is reached: from then on it ends with
// a closing engagement, with the first record that comes 180 s or more after the one before, or
// another 300 s later. In any state it ends when the user identifier has changed, or on request.
//
// Threading: any thread. What is added and asked goes through one inbox, which the queue takes out
// in that order, many at a time. Ownership: the assembly outlives it; timers hold it weakly.
// Errors: feedback that the service does not want is dropped silently; where too much waits to be
// written, further feedback is dropped too, counted and named.
class ClientSessionManager final : public SessionManager,
                                   public std::enable_shared_from_this<ClientSessionManager> {
 public:
  ClientSessionManager(Assembly& assembly, std::shared_ptr<UserGUIDSource> guidController,
                       std::string identifier, std::shared_ptr<FeedbackRoom> room);

  bool addZelkorFeedback(ZelkorFeedback feedback) override;
  // The open session; null when there is none.
  std::shared_ptr<SessionRecords> session();
  void flushSession(std::function<void()> callback) override;
  // Of a session shared by all clients only the end of the connection is recorded.
  void flushSessionInvalidation(std::optional<std::string> agent, std::int64_t process,
                                std::function<void(bool flushed)> callback) override;
  std::vector<std::string> feedbacksWithRelativeTimestamp() override;
  void waitForPendingFeedback() override;

  const std::string& identifier() const override { return identifier_; }
  SessionState currentState();
  // When the session counts as idle, once its soft limit is reached; steady time, so that the
  // clock may jump.
  SteadyTime expirationTime();

 private:
  // A record to add, or something to do between records.
  struct Entry {
    ZelkorFeedback feedback;
    std::function<void()> operation = nullptr;
  };

  void _put(Entry entry);
  void _takeInbox();
  // Runs the operation on the queue after all that was put before it, and returns then.
  void _runInOrder(FunctionRef<void()> operation);
  // Runs it on the queue after the delay, likewise, if the manager is still there.
  void _after(Duration delay, void (ClientSessionManager::*operation)(std::uint64_t session),
              std::uint64_t session);

  void _add(ZelkorFeedback feedback);
  // The event that the record raises.
  SessionEvent _eventOf(const ZelkorFeedback& feedback) const;
  void _updateState(ZelkorFeedback* feedback, SessionEvent externalEvent,
                    const std::function<void()>& callback);
  void _take(SessionStep step, const SessionTransition& transition, SessionEvent event,
             ZelkorFeedback* feedback, const std::function<void()>& callback);
  void _setNewSession(const ZelkorFeedback& feedback);
  void _flushSessionWithReason(SessionEndReason reason, const std::function<void()>& callback);
  void _checkSoftLimit(std::uint64_t expected);
  void _onUserGuidSoftLimitReached();
  void _checkMaxTimer(std::uint64_t expected);
  void _logFlush(SessionEvent event) const;
  void _post(std::string_view notification) const;

  // Fixed after construction.
  Assembly& assembly_;
  const std::shared_ptr<UserGUIDSource> guidController_;
  const std::string identifier_;
  const std::shared_ptr<FeedbackRoom> room_;
  const std::unique_ptr<SerialQueue> sessionQueue_;

  // Own synchronisation.
  Mutex inboxMutex_;
  std::vector<Entry> inbox_ ZK_GUARDED_BY(inboxMutex_);
  Transaction inboxTransaction_ ZK_GUARDED_BY(inboxMutex_);  // open while the inbox has something

  // Queue state.
  std::shared_ptr<SessionRecords> session_ ZK_ON(sessionQueue_);
  std::uint64_t sessionCounter_ ZK_ON(sessionQueue_) = 0;  // sessions opened so far
  SessionState currentState_ ZK_ON(sessionQueue_) = SessionState::NoSession;
  SessionEndReason flushReason_ ZK_ON(sessionQueue_) = SessionEndReason::None;
  SteadyTime expirationTime_ ZK_ON(sessionQueue_) = {};
};

}  // namespace zelkord
