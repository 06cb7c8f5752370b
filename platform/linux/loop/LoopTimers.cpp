#include "platform/linux/loop/LoopTimers.h"

namespace zelkord {

LoopTimers::Place LoopTimers::place(SteadyTime due, std::shared_ptr<const Task> task,
                                    const Place& former) {
  const Place place(due, ++lastId_);
  auto node = tasks_.extract(former);
  if (node.empty()) {
    tasks_.emplace(place, std::move(task));
  } else {
    node.key() = place;
    tasks_.insert(std::move(node));
  }
  return place;
}

void LoopTimers::clear() { const auto dropped = std::exchange(tasks_, {}); }

void LoopTimers::runDue() {
  if (tasks_.empty() && alarmTime_ == kNever) return;
  const auto now = steadyNow();
  if (alarmTime_ <= now) alarmTime_ = kNever;  // it has gone off
  while (!tasks_.empty() && tasks_.begin()->first.first <= now) {
    const auto due = tasks_.extract(tasks_.begin());
    (*due.mapped())();
  }
}

void LoopTimers::setAlarm() {
  const auto due = tasks_.empty() ? kNever : tasks_.begin()->first.first;
  if (due == alarmTime_ || (due > alarmTime_ && due != kNever)) return;
  alarmTime_ = due;
  alarm_.set(due);
}

}  // namespace zelkord
