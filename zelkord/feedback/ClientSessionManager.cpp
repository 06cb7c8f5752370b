#include "zelkord/feedback/ClientSessionManager.h"

#include <utility>

#include "halvane/DaemonFeedback.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/assembly/NotificationNames.h"
#include "zelkord/feedback/ClientSession.h"
#include "zelkord/feedback/ClientSessionShared.h"
#include "zelkord/feedback/FeedbackSeams.h"
#include "zelkord/feedback/UserGUIDSource.h"

namespace zelkord {
namespace {

constexpr Duration kSoftLimit = 600s;  // after a session opens
constexpr Duration kMaxTimer = 300s;   // after the soft limit
constexpr Duration kIdleTime = 180s;   // after a record

}  // namespace

ClientSessionManager::ClientSessionManager(Assembly& assembly,
                                           std::shared_ptr<UserGUIDSource> guidController,
                                           std::string identifier,
                                           std::shared_ptr<FeedbackRoom> room)
    : assembly_(assembly),
      guidController_(std::move(guidController)),
      identifier_(std::move(identifier)),
      room_(std::move(room)),
      sessionQueue_(assembly.platform().queues.makeSerialQueue(
          "com.quenta.zelkord.clientSessionManagerQueue")) {
  const auto& log = assembly.log(Category::Session);
  if (assembly.sharedSession()) {
    log.info("Zelkor is using shared session for all clients {}", identifier_);
  } else {
    log.info("Zelkor is using individual session for clients {}", identifier_);
  }
}

bool ClientSessionManager::addZelkorFeedback(ZelkorFeedback feedback) {
  stamp(feedback, assembly_.platform().clock);
  if (!room_->take(feedback)) return false;
  _put({std::move(feedback)});
  return true;
}

// Whoever puts something into the empty inbox has it taken out.
void ClientSessionManager::_put(Entry entry) {
  bool isFirst = false;
  {
    const MutexLock lock(inboxMutex_);
    isFirst = inbox_.empty();
    inbox_.push_back(std::move(entry));
    if (isFirst) inboxTransaction_ = assembly_.platform().transactions.open("addFeedback");
  }
  if (isFirst) sessionQueue_->async([self = shared_from_this()] { self->_takeInbox(); });
}

void ClientSessionManager::_takeInbox() {
  sessionQueue_->assertCurrent();
  Transaction transaction;
  std::vector<Entry> entries;
  {
    const MutexLock lock(inboxMutex_);
    entries.swap(inbox_);
    transaction = std::move(inboxTransaction_);
  }
  for (auto& entry : entries) {
    if (entry.operation) {
      entry.operation();
    } else {
      _add(std::move(entry.feedback));
    }
  }
}

void ClientSessionManager::_runInOrder(FunctionRef<void()> operation) {
  sessionQueue_->sync([&] {
    _takeInbox();
    operation();
  });
}

void ClientSessionManager::_after(Duration delay,
                                  void (ClientSessionManager::*operation)(std::uint64_t),
                                  std::uint64_t session) {
  sessionQueue_
      ->after(delay,
              [weak = weak_from_this(), operation, session] {
                const auto self = weak.lock();
                if (!self) return;
                self->_takeInbox();
                ((*self).*operation)(session);
              })
      .detach();
}

std::shared_ptr<SessionRecords> ClientSessionManager::session() {
  std::shared_ptr<SessionRecords> session;
  _runInOrder([&] {
    sessionQueue_->assertCurrent();
    session = session_;
  });
  return session;
}

SessionState ClientSessionManager::currentState() {
  auto state = SessionState::NoSession;
  _runInOrder([&] {
    sessionQueue_->assertCurrent();
    state = currentState_;
  });
  return state;
}

SteadyTime ClientSessionManager::expirationTime() {
  SteadyTime time;
  _runInOrder([&] {
    sessionQueue_->assertCurrent();
    time = expirationTime_;
  });
  return time;
}

std::vector<std::string> ClientSessionManager::feedbacksWithRelativeTimestamp() {
  const auto open = session();
  return open ? open->feedbacksWithRelativeTimestamp() : std::vector<std::string>();
}

void ClientSessionManager::waitForPendingFeedback() {
  _runInOrder([] {});
}

void ClientSessionManager::flushSession(std::function<void()> callback) {
  _put({{}, [this, callback = std::move(callback)] {
          _updateState(nullptr, SessionEvent::ExternalFlush, callback);
        }});
}

void ClientSessionManager::flushSessionInvalidation(std::optional<std::string> agent,
                                                    std::int64_t process,
                                                    std::function<void(bool flushed)> callback) {
  if (!assembly_.sharedSession()) {
    flushSession([callback = std::move(callback)] { callback(true); });
    return;
  }
  ZelkorFeedback record;
  record.feedback = std::make_shared<ZelkorConnectionInvalidated>();
  record.userAgent = std::move(agent);
  record.pid = process;
  addZelkorFeedback(std::move(record));
  callback(false);
}

void ClientSessionManager::_add(ZelkorFeedback feedback) {
  sessionQueue_->assertCurrent();
  auto* gate = assembly_.feedbackGate();
  if (gate && gate->dropsFeedback(feedback.userAgent)) return;
  feedback.userGuid = guidController_->currentUserGUID();
  _updateState(&feedback, _eventOf(feedback), nullptr);
  expirationTime_ = assembly_.platform().clock.now() + kIdleTime;
}

SessionEvent ClientSessionManager::_eventOf(const ZelkorFeedback& feedback) const {
  sessionQueue_->assertCurrent();
  const bool isOpen = currentState_ != SessionState::NoSession;
  if (isOpen && session_ && session_->userGuid() != feedback.userGuid) {
    return SessionEvent::GuidChanged;
  }
  if (currentState_ == SessionState::SoftLimitReached) {
    if (suggestsSessionEnd(feedback.type())) return SessionEvent::Engagement;
    if (expirationTime_ <= assembly_.platform().clock.now()) return SessionEvent::IdleExpired;
  }
  return SessionEvent::Feedback;
}

void ClientSessionManager::_updateState(ZelkorFeedback* feedback, SessionEvent externalEvent,
                                        const std::function<void()>& callback) {
  sessionQueue_->assertCurrent();
  const auto transition = transitionOf(currentState_, externalEvent);
  for (const auto step : transition) _take(step, transition, externalEvent, feedback, callback);
  currentState_ = transition.next;
}

void ClientSessionManager::_take(SessionStep step, const SessionTransition& transition,
                                 SessionEvent event, ZelkorFeedback* feedback,
                                 const std::function<void()>& callback) {
  sessionQueue_->assertCurrent();
  const auto& log = assembly_.log(Category::Session);
  switch (step) {
    case SessionStep::AddFeedback:
      if (session_) session_->addFeedback(*feedback);
      return;
    case SessionStep::Flush:
      return _flushSessionWithReason(transition.reason, [this, event, &callback] {
        _logFlush(event);
        if (callback) callback();
      });
    case SessionStep::ResetGUID:
      return guidController_->reset();
    case SessionStep::TakeNewGUID:
      feedback->userGuid = guidController_->currentUserGUID();
      return;
    case SessionStep::OpenSession:
      return _setNewSession(*feedback);
    case SessionStep::InsertFlush:
      if (auto* activities = assembly_.backgroundFlusher()) {
        activities->insertFlushActivity(nullptr);
      }
      return;
    case SessionStep::RefuseFeedback:
      return log.error("Avoided adding feedback in state {}", static_cast<unsigned>(currentState_));
    case SessionStep::ReportUnknown:
      return log.error("External event received {}", static_cast<std::uint32_t>(event));
  }
}

void ClientSessionManager::_logFlush(SessionEvent event) const {
  const auto& log = assembly_.log(Category::Session);
  switch (event) {
    case SessionEvent::MaxTimerExpired:
      return log.info("session flushed because max timer expired {}", identifier_);
    case SessionEvent::CriticalMemory:
      return log.info("session flushed because of critical memory");
    case SessionEvent::IdleExpired:
      return log.info("session flushed because soft limit reached and idle time was beyond {} {}",
                      std::chrono::duration_cast<std::chrono::seconds>(kIdleTime).count(),
                      identifier_);
    case SessionEvent::GuidChanged:
      return log.info("session flushed because guid changed {}", identifier_);
    case SessionEvent::Engagement:
      return log.info("session flushed because soft limit reached and sentinel feedback received");
    default:
      return;
  }
}

void ClientSessionManager::_setNewSession(const ZelkorFeedback& feedback) {
  sessionQueue_->assertCurrent();
  ++sessionCounter_;
  if (assembly_.sharedSession()) {
    session_ = std::make_shared<ClientSessionShared>(assembly_, feedback, flushReason_);
  } else {
    session_ = ClientSession::make(assembly_, feedback, flushReason_);
  }
  assembly_.log(Category::Session).info("new session id {} {}", sessionCounter_, identifier_);
  _after(kSoftLimit, &ClientSessionManager::_checkSoftLimit, sessionCounter_);
}

void ClientSessionManager::_checkSoftLimit(std::uint64_t expected) {
  sessionQueue_->assertCurrent();
  assembly_.log(Category::Session)
      .info("soft limit reached expected {} current {} {}", expected, sessionCounter_, identifier_);
  if (expected == sessionCounter_) _onUserGuidSoftLimitReached();
}

void ClientSessionManager::_onUserGuidSoftLimitReached() {
  sessionQueue_->assertCurrent();
  if (!session_) return;
  _updateState(nullptr, SessionEvent::SoftLimitReached, nullptr);
  assembly_.log(Category::Session)
      .info("soft limit reached, maxtimer session id {} {}", sessionCounter_, identifier_);
  sessionQueue_->async(
      [self = shared_from_this()] { self->_post(kZLKSessionSoftLimitNotification); });
  _after(kMaxTimer, &ClientSessionManager::_checkMaxTimer, sessionCounter_);
}

// A newer session does not keep the notification from being posted: its observers want to know
// that so much time has passed.
void ClientSessionManager::_checkMaxTimer(std::uint64_t expected) {
  sessionQueue_->assertCurrent();
  assembly_.log(Category::Session)
      .info("max timer expired expected {} current {}", expected, sessionCounter_);
  if (expected == sessionCounter_) {
    if (!session_) return;
    _updateState(nullptr, SessionEvent::MaxTimerExpired, nullptr);
  }
  _post(kZLKSessionMaxLimitNotification);
}

void ClientSessionManager::_post(std::string_view notification) const {
  assembly_.notificationCenter().post(std::string(notification));
}

void ClientSessionManager::_flushSessionWithReason(SessionEndReason reason,
                                                   const std::function<void()>& callback) {
  sessionQueue_->assertCurrent();
  if (!session_) {
    if (callback) callback();
    return;
  }
  flushReason_ = reason;
  session_->enumerateSessions([&](ClientSession& member, bool isLast) {
    if (reason != SessionEndReason::None) {
      const auto trigger = static_cast<std::int64_t>(reason);
      member.addFeedback({std::make_shared<ZelkorSessionEndFeedback>(trigger), 0, member.userGuid(),
                          member.agent()});
    }
    member.sessionComplete();
    if (isLast && callback) callback();
  });
  session_ = nullptr;
}

}  // namespace zelkord
