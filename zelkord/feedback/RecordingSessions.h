#pragma once

#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "base/Guarded.h"
#include "base/Mutex.h"
#include "halvane/DaemonFeedback.h"
#include "zelkord/feedback/SessionManager.h"

namespace zelkord {

// For tests: sessions that only write down what they get. Threading: any thread.

class RecordedFeedback final {
 public:
  void add(ZelkorFeedback feedback) {
    const MutexLock lock(mutex_);
    feedback.held = nullptr;  // it is written
    records_.push_back(std::move(feedback));
  }
  void clear() {
    const MutexLock lock(mutex_);
    records_.clear();
  }
  std::vector<ZelkorFeedback> all() const {
    const MutexLock lock(mutex_);
    return records_;
  }

 private:
  mutable Mutex mutex_;
  std::vector<ZelkorFeedback> records_ ZK_GUARDED_BY(mutex_);
};

class RecordingSessionManager final : public SessionManager {
 public:
  RecordingSessionManager(std::string identifier, bool sharedByAllClients)
      : identifier_(std::move(identifier)), shared_(sharedByAllClients) {}

  bool addZelkorFeedback(ZelkorFeedback feedback) override {
    if (!isFull.get()) records_.add(std::move(feedback));
    return !isFull.get();
  }
  void flushSession(std::function<void()> callback) override {
    records_.clear();
    if (callback) callback();
  }
  void flushSessionInvalidation(std::optional<std::string> agent, std::int64_t process,
                                std::function<void(bool flushed)> callback) override {
    if (!shared_) return flushSession([callback = std::move(callback)] { callback(true); });
    ZelkorFeedback record;
    record.feedback = std::make_shared<ZelkorConnectionInvalidated>();
    record.userAgent = std::move(agent);
    record.pid = process;
    addZelkorFeedback(std::move(record));
    callback(false);
  }
  std::vector<std::string> feedbacksWithRelativeTimestamp() override { return texts.get(); }
  void waitForPendingFeedback() override {
    if (whileWaiting) whileWaiting();
  }
  const std::string& identifier() const override { return identifier_; }
  const RecordedFeedback& records() const { return records_; }

  Guarded<bool> isFull{false};              // then nothing is added
  Guarded<std::vector<std::string>> texts;  // the answer of feedbacksWithRelativeTimestamp
  std::function<void()> whileWaiting;       // set before it is used

 private:
  const std::string identifier_;
  const bool shared_;
  RecordedFeedback records_;
};

// Makes such managers, and one-off sessions whose records all go to `completed`, each session's
// when it is complete.
class RecordingSessions final : public FeedbackSessions {
 public:
  explicit RecordingSessions(bool sharedByAllClients) : shared_(sharedByAllClients) {}

  std::shared_ptr<SessionManager> makeManager(std::string identifier,
                                              std::shared_ptr<UserGUIDSource>) override {
    return std::make_shared<RecordingSessionManager>(std::move(identifier), shared_);
  }
  std::shared_ptr<FeedbackSession> makeSession(ZelkorFeedback first) override {
    if (isFull.get()) return nullptr;
    auto session = std::make_shared<Session>(completed_);
    session->addFeedback(std::move(first));
    return session;
  }
  const RecordedFeedback& completed() const { return *completed_; }

  Guarded<bool> isFull{false};  // then no session is made

 private:
  class Session final : public FeedbackSession {
   public:
    explicit Session(std::shared_ptr<RecordedFeedback> completed)
        : completed_(std::move(completed)) {}
    void addFeedback(ZelkorFeedback feedback) override { records_.add(std::move(feedback)); }
    void sessionComplete() override {
      for (auto& record : records_.all()) completed_->add(std::move(record));
      records_.clear();
    }

   private:
    const std::shared_ptr<RecordedFeedback> completed_;
    RecordedFeedback records_;
  };

  const bool shared_;
  const std::shared_ptr<RecordedFeedback> completed_ = std::make_shared<RecordedFeedback>();
};

}  // namespace zelkord
