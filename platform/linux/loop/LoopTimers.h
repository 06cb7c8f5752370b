#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <utility>

#include "base/Time.h"
#include "platform/api/WorkQueue.h"
#include "platform/linux/loop/SteadyTimer.h"

namespace zelkord {

// When a loop's tasks are due, and the kernel's timer that wakes it for the next one.
//
// Threading: the loop; `descriptor` on any thread.
class LoopTimers final {
 public:
  // A task's place. What is not in use (any more) may be cancelled without harm.
  using Place = std::pair<SteadyTime, std::uint64_t>;
  static constexpr SteadyTime kNever = SteadyTimer::kNever;

  // Runs the task at that time instead of the one of `former`, if it has not run by then.
  Place place(SteadyTime due, std::shared_ptr<const Task> task, const Place& former = {});
  void cancel(const Place& place) { tasks_.erase(place); }
  void clear();

  // An edge each time that something may be due; there is nothing to read.
  int descriptor() const { return alarm_.descriptor(); }
  void runDue();
  // Sets the alarm for the next task, unless it goes off before.
  void setAlarm();

 private:
  SteadyTimer alarm_{SteadyTimer::Reads::DoNotWait};
  SteadyTime alarmTime_ = kNever;
  std::uint64_t lastId_ = 0;  // 0 is nobody's
  std::map<Place, std::shared_ptr<const Task>> tasks_;
};

}  // namespace zelkord
