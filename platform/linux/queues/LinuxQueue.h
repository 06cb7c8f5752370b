#pragma once

#include <memory>
#include <string>
#include <utility>

#include "platform/linux/queues/Alarm.h"
#include "platform/linux/queues/LinuxClock.h"
#include "platform/linux/queues/QueueCore.h"
#include "platform/linux/queues/QueueFrame.h"
#include "platform/linux/queues/TimerService.h"

namespace zelkord {

// What timers need of a queue besides its interface.
class AlarmTarget {
 public:
  virtual ~AlarmTarget() = default;
  // A new alarm whose task runs as an ordinary one of this queue.
  virtual std::shared_ptr<Alarm> makeAlarm(Task task, Alarm::Kind kind) const = 0;
};

// What all Linux queues have in common: a core and the timers. `Interface` is the kind of queue,
// `kAccess` how its ordinary tasks run. The last class closes the queue in its destructor: a task
// that still runs uses all of it.
template <typename Interface, QueueCore::Access kAccess>
class LinuxQueue : public Interface, public AlarmTarget {
 public:
  LinuxQueue(std::shared_ptr<QueueCore> core, std::shared_ptr<TimerService> timers, double rate)
      : core_(std::move(core)), timers_(std::move(timers)), rate_(rate) {}
  LinuxQueue(const LinuxQueue&) = delete;
  LinuxQueue& operator=(const LinuxQueue&) = delete;

  void async(Task task) final { core_->async(kAccess, std::move(task)); }
  void sync(FunctionRef<void()> task) override { core_->sync(kAccess, task); }
  Subscription after(Duration delay, Task task, TimeBase base) final {
    const auto alarm = makeAlarm(std::move(task), Alarm::Kind::Once);
    timers_->arm(alarm, base == TimeBase::Scaled ? realDuration(delay, rate_) : delay,
                 Duration::zero());
    // The alarm belongs to the timers, then to its firing: a queue that drops it lets its captures
    // go.
    return Subscription([timers = std::weak_ptr(timers_), weak = std::weak_ptr(alarm)] {
      const auto alive = weak.lock();
      if (!alive) return;
      if (const auto service = timers.lock()) {
        service->remove(*alive);
      } else {
        alive->retire();
      }
    });
  }
  bool isCurrent() const final { return core_->isCurrent(QueueCore::Access::Shared); }
  const std::string& label() const final { return core_->label(); }

  std::shared_ptr<Alarm> makeAlarm(Task task, Alarm::Kind kind) const final {
    return std::make_shared<Alarm>(core_, kAccess, std::move(task), kind);
  }

 protected:
  void close() {
    timers_->removeAllOf(*core_);
    core_->close();
  }
  QueueCore& core() const { return *core_; }

 private:
  const std::shared_ptr<QueueCore> core_;
  const std::shared_ptr<TimerService> timers_;
  const double rate_;  // of the clock
};

class LinuxSerialQueue final : public LinuxQueue<SerialQueue, QueueCore::Access::Exclusive> {
 public:
  using LinuxQueue::LinuxQueue;
  ~LinuxSerialQueue() override { close(); }

  void setQuality(QualityOfService quality) override { core().setQuality(quality); }
};

class LinuxConcurrentQueue final : public LinuxQueue<ConcurrentQueue, QueueCore::Access::Shared> {
 public:
  using LinuxQueue::LinuxQueue;
  ~LinuxConcurrentQueue() override { close(); }

  void barrierAsync(Task task) override {
    core().async(QueueCore::Access::Exclusive, std::move(task));
  }
  void barrierSync(FunctionRef<void()> task) override {
    core().sync(QueueCore::Access::Exclusive, task);
  }
  bool isBarrierCurrent() const override { return core().isCurrent(QueueCore::Access::Exclusive); }
};

// A global queue: nothing there is exclusive, so that `sync` has nothing to wait for.
class LinuxGlobalQueue final : public LinuxQueue<WorkQueue, QueueCore::Access::Shared> {
 public:
  using LinuxQueue::LinuxQueue;
  ~LinuxGlobalQueue() override { close(); }

  void sync(FunctionRef<void()> task) override {
    const QueueFrame frame(core(), QueueCore::Access::Shared);
    task();
  }
};

}  // namespace zelkord
