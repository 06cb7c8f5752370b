#pragma once

#include <memory>
#include <string>
#include <utility>

#include "platform/testing/TimelineCore.h"

namespace zelkord {

// What all queues of a ManualTimeline have in common. `Interface` is the kind of queue; `kAccess`
// how its ordinary tasks run.
template <typename Interface, TimelineCore::Access kAccess>
class ManualQueue : public Interface {
 public:
  ManualQueue(std::shared_ptr<TimelineCore> core, std::string label, bool global = false)
      : core_(std::move(core)), queue_(std::make_shared<TimelineCore::Queue>()) {
    queue_->label = std::move(label);
    queue_->global = global;
  }
  ~ManualQueue() override { core_->drop(queue_.get()); }
  ManualQueue(const ManualQueue&) = delete;
  ManualQueue& operator=(const ManualQueue&) = delete;

  void async(Task task) final { core_->post(queue_, {}, kAccess, std::move(task)); }
  void sync(FunctionRef<void()> task) final { core_->sync(queue_, kAccess, task); }
  Subscription after(Duration delay, Task task, TimeBase) final {
    const auto key = core_->post(queue_, delay, kAccess, std::move(task));
    return Subscription([weak = std::weak_ptr(core_), key] {
      if (const auto core = weak.lock()) core->cancel(key);
    });
  }
  bool isCurrent() const final { return core_->isCurrent(*queue_, TimelineCore::Access::Shared); }
  const std::string& label() const final { return queue_->label; }

  const TimelineCore::QueuePointer& queue() const { return queue_; }

 protected:
  const std::shared_ptr<TimelineCore>& core() const { return core_; }

 private:
  const std::shared_ptr<TimelineCore> core_;
  const TimelineCore::QueuePointer queue_;
};

using ManualSerialQueue = ManualQueue<SerialQueue, TimelineCore::Access::Exclusive>;
using ManualGlobalQueue = ManualQueue<WorkQueue, TimelineCore::Access::Shared>;

class ManualConcurrentQueue final
    : public ManualQueue<ConcurrentQueue, TimelineCore::Access::Shared> {
 public:
  using ManualQueue::ManualQueue;

  void barrierAsync(Task task) override {
    core()->post(queue(), {}, TimelineCore::Access::Exclusive, std::move(task));
  }
  void barrierSync(FunctionRef<void()> task) override {
    core()->sync(queue(), TimelineCore::Access::Exclusive, task);
  }
  bool isBarrierCurrent() const override {
    return core()->isCurrent(*queue(), TimelineCore::Access::Exclusive);
  }
};

}  // namespace zelkord
