#include "platform/linux/process/ExitWhenIdle.h"

#include <utility>

namespace zelkord {

ExitWhenIdle::ExitWhenIdle(WorkQueues& queues, const Clock& clock,
                           CountedTransactions& transactions, Duration limit,
                           std::function<void()> hook)
    : hook_(std::move(hook)),
      clock_(clock),
      transactions_(transactions),
      limit_(limit),
      queue_(queues.makeSerialQueue("com.quenta.zelkord.idle")),
      timer_(queues.makeTimer(*queue_, [this] { _look(); })) {
  timer_->arm(limit_, Duration::zero());
}

void ExitWhenIdle::_look() {
  queue_->assertCurrent();
  if (!hook_) return;
  const auto idleSince = transactions_.idleSince();
  if (!idleSince) {
    // Once it is over, a whole `limit` is ahead.
    transactions_.whenIdle([weak = std::weak_ptr(timer_), limit = limit_] {
      if (const auto timer = weak.lock()) timer->arm(limit, Duration::zero());
    });
    return;
  }
  const Duration left = limit_ - (clock_.now() - *idleSince);
  if (left > Duration::zero()) {
    timer_->arm(left, Duration::zero());
  } else {
    std::exchange(hook_, nullptr)();
  }
}

}  // namespace zelkord
