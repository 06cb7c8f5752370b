#include "zelkord/core/IdleTimer.h"

namespace zelkord {
namespace {

constexpr Duration kIdleTime = 180s;
constexpr Duration kIdleLeeway = 60s;

}  // namespace

IdleTimer::IdleTimer(std::function<void()> timedOut) : timedOut_(std::move(timedOut)) {}

std::shared_ptr<IdleTimer> IdleTimer::make(WorkQueues& queues, std::function<void()> timedOut) {
  const std::shared_ptr<IdleTimer> idle(new IdleTimer(std::move(timedOut)));
  idle->timer_ =
      queues.makeTimer(queues.global(QualityOfService::Background), [weak = std::weak_ptr(idle)] {
        if (const auto self = weak.lock()) self->_fired();
      });
  idle->rearm();
  return idle;
}

void IdleTimer::rearm() {
  if (!cancelled_) timer_->arm(kIdleTime, kIdleLeeway);
}

IdleTimer::CallMark IdleTimer::callBegan() {
  ++callsUnderWay_;
  return {static_cast<void*>(this), [self = shared_from_this()](void*) {
            --self->callsUnderWay_;
            self->rearm();
          }};
}

void IdleTimer::cancel() {
  cancelled_ = true;
  timer_->cancel();
}

void IdleTimer::_fired() {
  if (cancelled_) return;  // a message that came with the end may have armed it once more
  if (callsUnderWay_ > 0) {
    rearm();
  } else {
    timedOut_();
  }
}

}  // namespace zelkord
