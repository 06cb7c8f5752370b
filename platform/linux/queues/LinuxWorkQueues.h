#pragma once

#include <array>
#include <functional>
#include <memory>
#include <string>

#include "platform/api/WorkQueues.h"
#include "platform/linux/loop/LoopCrew.h"
#include "platform/linux/queues/LinuxClock.h"
#include "platform/linux/queues/WorkerPool.h"

namespace zelkord {

class MainLoop;
class TimerService;

// The process's queues, on one pool of workers, the leaders of its crew's loops and one timer
// thread.
//
// Threading: any thread.
// Ownership: outlives the tasks of its queues. Destroying it ends its threads, so every task that
// runs must be able to end, and not on one of its own workers; what was made by it and is still
// there then does nothing any more.
class LinuxWorkQueues final : public WorkQueues {
 public:
  // `workers`: see WorkerPool.
  explicit LinuxWorkQueues(const LinuxClock& clock, unsigned workers = 0);
  ~LinuxWorkQueues() override;
  LinuxWorkQueues(const LinuxWorkQueues&) = delete;
  LinuxWorkQueues& operator=(const LinuxWorkQueues&) = delete;

  std::unique_ptr<SerialQueue> makeSerialQueue(
      std::string label, QualityOfService quality = QualityOfService::Default) override;
  std::unique_ptr<ConcurrentQueue> makeConcurrentQueue(std::string label) override;
  WorkQueue& global(QualityOfService quality) override;
  SerialQueue& main() override;
  std::unique_ptr<Semaphore> makeSemaphore(unsigned permits) override;
  std::unique_ptr<Group> makeGroup() override;
  // Requires a queue of this factory.
  std::unique_ptr<Timer> makeTimer(WorkQueue& queue, Task task) override;

  // Runs the main queue's tasks on the calling thread until `stopMainLoop`.
  void runMainLoop();
  void stopMainLoop();

  // For loops whose work goes to these queues. They end before this.
  LoopCrew& crew() { return crew_; }
  WorkerPool::Counts workers() const { return pool_->counts(); }
  // See WorkerPool.
  void onRefusedWait(std::function<void()> report) { pool_->onRefusedWait(std::move(report)); }

 private:
  const double rate_;
  const std::shared_ptr<WorkerPool> pool_;
  const std::shared_ptr<MainLoop> mainLoop_;
  const std::shared_ptr<TimerService> timers_;
  const std::unique_ptr<SerialQueue> main_;
  std::array<std::unique_ptr<WorkQueue>, 4> globals_;
  LoopCrew crew_;
};

}  // namespace zelkord
