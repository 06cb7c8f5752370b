#pragma once

#include <memory>
#include <string>

#include "zelkord/feedback/RecentRecords.h"
#include "zelkord/feedback/SessionManager.h"

namespace zelkord {

// A session manager that keeps the last 1,000 records of its one session in memory.
//
// Threading: any thread. Errors: none; what no longer fits is forgotten.
class InMemorySessionManager final : public SessionManager {
 public:
  InMemorySessionManager(std::string identifier, bool sharedByAllClients);

  void addZelkorFeedback(ZelkorFeedback feedback) override;
  void flushSession(std::function<void()> callback) override;
  // Shared by all clients: notes the end of the connection and answers false. Else ends the session
  // and answers true.
  void flushSessionInvalidation(std::optional<std::string> agent,
                                std::function<void(bool flushed)> callback) override;
  const std::string& identifier() const override { return identifier_; }
  const RecentRecords& records() const { return records_; }

 private:
  const std::string identifier_;
  const bool shared_;
  RecentRecords records_;
};

// Makes managers and one-off sessions in memory; keeps the records of the sessions that are
// complete. Threading: any thread. Ownership: outlives the sessions that it made.
class InMemorySessions final : public FeedbackSessions {
 public:
  explicit InMemorySessions(bool sharedByAllClients) : shared_(sharedByAllClients) {}

  std::shared_ptr<SessionManager> makeManager(std::string identifier) override;
  std::shared_ptr<FeedbackSession> makeSession(ZelkorFeedback first) override;
  const RecentRecords& completed() const { return *completed_; }

 private:
  const bool shared_;
  const std::shared_ptr<RecentRecords> completed_ = std::make_shared<RecentRecords>(1000);
};

}  // namespace zelkord
