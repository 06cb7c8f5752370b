#pragma once

#include <memory>

#include "platform/linux/loop/Loop.h"

namespace zelkord {

// A task that runs at a time that changes often: another time costs no allocation, and rarely a
// call of the kernel.
//
// Threading: the loop; made, and destroyed while it is not set, on any thread.
// Ownership: destroying it cancels, also from within its task. The loop outlives it.
class LoopTimer final {
 public:
  static constexpr SteadyTime kNever = LoopTimers::kNever;

  LoopTimer(Loop& loop, Task task);
  ~LoopTimer() { set(kNever); }
  LoopTimer(const LoopTimer&) = delete;
  LoopTimer& operator=(const LoopTimer&) = delete;

  // Replaces the time, which is over once the task runs; kNever: not at all.
  void set(SteadyTime due);

 private:
  Loop& loop_;
  const std::shared_ptr<const Task> task_;
  LoopTimers::Place place_;  // the loop's
};

}  // namespace zelkord
