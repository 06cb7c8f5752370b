#include "platform/linux/loop/LoopTimer.h"

#include <utility>

namespace zelkord {
namespace {
constexpr LoopTimers::Place kNoPlace;
}  // namespace

LoopTimer::LoopTimer(Loop& loop, Task task)
    : loop_(loop), task_(std::make_shared<const Task>([this, task = std::move(task)] {
        place_ = kNoPlace;
        task();
      })) {}

void LoopTimer::set(SteadyTime due) {
  if (due == kNever && place_ == kNoPlace) return;
  if (due == place_.first && place_ != kNoPlace) return;
  if (due == kNever) {
    loop_.timers().cancel(std::exchange(place_, kNoPlace));
  } else {
    place_ = loop_.timers().place(due, task_, place_);
  }
}

}  // namespace zelkord
