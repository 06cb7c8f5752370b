#pragma once

#include <cstdint>
#include <memory>
#include <utility>

#include "base/Check.h"
#include "platform/api/WorkQueues.h"
#include "platform/testing/TimelineCore.h"

namespace zelkord {

// What threads wait on, on a manual timeline: waiting runs the timeline.

class ManualSemaphore final : public Semaphore {
 public:
  ManualSemaphore(std::shared_ptr<TimelineCore> core, unsigned permits)
      : core_(std::move(core)), permits_(permits) {}

  void signal(unsigned permits) override { permits_ += permits; }
  bool wait(Duration timeout) override {
    const auto ready = [this] { return permits_ > 0; };
    const bool taken = timeout <= Duration::zero()
                           ? ready()
                           : core_->pump(ready, deadlineAfter(core_->now(), timeout));
    if (taken) --permits_;
    return taken;
  }

 private:
  const std::shared_ptr<TimelineCore> core_;
  std::uint64_t permits_;
};

class ManualGroup final : public Group {
 public:
  explicit ManualGroup(std::shared_ptr<TimelineCore> core) : core_(std::move(core)) {}

  void enter() override { ++count_; }
  void leave() override {
    ZK_CHECK(count_ > 0, "a group left more often than entered");
    --count_;
  }
  bool wait(Duration timeout) override {
    const auto ready = [this] { return count_ == 0; };
    return timeout <= Duration::zero() ? ready()
                                       : core_->pump(ready, deadlineAfter(core_->now(), timeout));
  }

 private:
  const std::shared_ptr<TimelineCore> core_;
  std::uint64_t count_ = 0;
};

// Fires exactly when due, whatever the leeway.
class ManualTimer final : public Timer {
 public:
  ManualTimer(WorkQueue& queue, Task task)
      : queue_(queue), task_(std::make_shared<const Task>(std::move(task))) {}

  void arm(Duration delay, Duration) override {
    armed_.reset();
    armed_ = queue_.after(delay, [task = task_] { (*task)(); });
  }
  void cancel() override { armed_.reset(); }

 private:
  WorkQueue& queue_;
  const std::shared_ptr<const Task> task_;
  Subscription armed_;
};

}  // namespace zelkord
