#include "zelkord/feedback/InMemorySessions.h"

#include <utility>

#include "halvane/DaemonFeedback.h"

namespace zelkord {
namespace {

constexpr std::size_t kRecordsKept = 1000;

class InMemorySession final : public FeedbackSession {
 public:
  InMemorySession(ZelkorFeedback first, std::shared_ptr<RecentRecords> completed)
      : completed_(std::move(completed)), records_(kRecordsKept) {
    records_.add(std::move(first));
  }

  void addFeedback(ZelkorFeedback feedback) override { records_.add(std::move(feedback)); }
  void sessionComplete() override {
    for (auto& record : records_.all()) completed_->add(std::move(record));
    records_.clear();
  }

 private:
  const std::shared_ptr<RecentRecords> completed_;
  RecentRecords records_;
};

}  // namespace

InMemorySessionManager::InMemorySessionManager(std::string identifier, bool sharedByAllClients)
    : identifier_(std::move(identifier)), shared_(sharedByAllClients), records_(kRecordsKept) {}

void InMemorySessionManager::addZelkorFeedback(ZelkorFeedback feedback) {
  records_.add(std::move(feedback));
}

void InMemorySessionManager::flushSession(std::function<void()> callback) {
  records_.clear();
  if (callback) callback();
}

void InMemorySessionManager::flushSessionInvalidation(std::optional<std::string> agent,
                                                      std::function<void(bool flushed)> callback) {
  if (!shared_) {
    flushSession([callback = std::move(callback)] { callback(true); });
    return;
  }
  addZelkorFeedback(
      {std::make_shared<ZelkorConnectionInvalidated>(), 0, std::nullopt, std::move(agent), 0});
  callback(false);
}

std::shared_ptr<SessionManager> InMemorySessions::makeManager(std::string identifier) {
  return std::make_shared<InMemorySessionManager>(std::move(identifier), shared_);
}

std::shared_ptr<FeedbackSession> InMemorySessions::makeSession(ZelkorFeedback first) {
  return std::make_shared<InMemorySession>(std::move(first), completed_);
}

}  // namespace zelkord
