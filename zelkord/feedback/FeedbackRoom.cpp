#include "zelkord/feedback/FeedbackRoom.h"

#include "zelkord/assembly/Assembly.h"

namespace zelkord {

FeedbackRoom::FeedbackRoom(Assembly& assembly)
    : clock_(assembly.platform().clock),
      waiting_("feedback_waiting", kWaiting, assembly.limits()),
      sessions_("feedback_sessions", kOneOffSessions, assembly.limits()) {}

bool FeedbackRoom::take(ZelkorFeedback& record) {
  auto share = waiting_.take(feedbackHolder(record), _cost(record));
  if (!share) return false;
  record.held = std::make_shared<Held>(Held{*std::move(share), std::move(record.held)});
  return true;
}

// The record and its places in queues; its message where it is kept and where it is laid out, each
// in a buffer that has grown to twice that.
std::uint64_t FeedbackRoom::_cost(const ZelkorFeedback& record) {
  constexpr std::uint64_t kFixed = 1024;
  constexpr std::uint64_t kBytesOfAByte = 4;
  return kFixed + kBytesOfAByte * (record.feedback ? record.feedback->messageSize() : 0);
}

bool FeedbackRoom::takeSession(const ZelkorFeedback& first) {
  const auto now = clock_.now();
  const MutexLock lock(mutex_);
  while (!begun_.empty() && begun_.front().first <= now) begun_.pop_front();
  auto share = sessions_.take(feedbackHolder(first));
  if (!share) return false;
  begun_.emplace_back(now + kOneOffPeriod, *std::move(share));
  return true;
}

}  // namespace zelkord
