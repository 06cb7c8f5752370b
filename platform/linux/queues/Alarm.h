#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <utility>

#include "base/Mutex.h"
#include "base/Time.h"
#include "platform/api/WorkQueue.h"
#include "platform/linux/queues/QueueCore.h"

namespace zelkord {

// One delayed task or timer, shared by its owner, the timer service and the firing under way.
//
// Each arming begins a new generation; a firing that reaches its queue runs the task only if its
// generation is still the current one.
//
// Threading: the schedule belongs to the timer service; the rest on any thread.
class Alarm final {
 public:
  enum class Kind { Once, Again };

  Alarm(std::weak_ptr<QueueCore> target, QueueCore::Access access, Task task, Kind kind)
      : target_(std::move(target)),
        access_(access),
        kind_(kind),
        task_(std::make_shared<const Task>(std::move(task))) {}

  // Hands the task of that generation to the queue.
  static void fire(const std::shared_ptr<Alarm>& alarm, std::uint64_t generation) {
    const auto target = alarm->target_.lock();
    if (!target) return;
    target->async(alarm->access_, [alarm, generation] { alarm->_run(generation); });
  }

  std::uint64_t beginGeneration() {
    const MutexLock lock(mutex_);
    return ++generation_;
  }
  // What is left of the task, for the caller to release.
  std::shared_ptr<const Task> retire() {
    const MutexLock lock(mutex_);
    ++generation_;
    return std::exchange(task_, nullptr);
  }
  bool isFor(const QueueCore& core) const { return target_.lock().get() == &core; }

 private:
  friend class TimerService;

  void _run(std::uint64_t generation) {
    std::shared_ptr<const Task> task;
    {
      const MutexLock lock(mutex_);
      if (generation != generation_) return;
      task = kind_ == Kind::Once ? std::exchange(task_, nullptr) : task_;
    }
    if (task) (*task)();
  }

  // Fixed after construction.
  const std::weak_ptr<QueueCore> target_;
  const QueueCore::Access access_;
  const Kind kind_;

  Mutex mutex_;
  std::uint64_t generation_ ZK_GUARDED_BY(mutex_) = 0;
  std::shared_ptr<const Task> task_ ZK_GUARDED_BY(mutex_);

  // The schedule, under the timer service's mutex.
  bool armed_ = false;
  std::uint64_t armedGeneration_ = 0;
  SteadyTime deadline_{};
  Duration leeway_{};
  std::optional<std::pair<SteadyTime, std::uint64_t>>
      place_;  // never later than deadline_ + leeway_
};

}  // namespace zelkord
