#pragma once

#include <array>
#include <memory>
#include <optional>
#include <string>

#include "base/FunctionRef.h"
#include "platform/api/Clock.h"
#include "platform/api/WorkQueues.h"

namespace zelkord {

class TimelineCore;

// Time and all queues of a test. Nothing happens by itself: the test runs what is due and moves the
// time.
//
// Tasks run in the order of their due time, ties in the order in which they were posted, whatever
// their queue. `sync` first runs what stands on that queue before it. A blocking wait (semaphore,
// group) runs other queues' tasks and moves the time forward up to its time-out; a queue whose task
// waits runs nothing else meanwhile. A wait within a wait ends before the outer one does. Timers
// fire exactly when due; `TimeBase` makes no difference.
//
// Time begins at 1000 s after boot and 2026-11-22 12:00:00 UTC.
//
// Threading: one thread, the one that made it.
// Ownership: queues, timers and subscriptions may outlive the timeline; its end drops all tasks.
// Errors: what would be a deadlock stops the process.
class ManualTimeline final : public Clock, public WorkQueues {
 public:
  ManualTimeline();
  ~ManualTimeline() override;
  ManualTimeline(const ManualTimeline&) = delete;
  ManualTimeline& operator=(const ManualTimeline&) = delete;

  // Runs what is due now, and what that posts, until nothing is.
  void runUntilIdle();
  // Moves the time forward, running what comes due on the way at its own time.
  void advance(Duration duration);
  // Runs until `done`, moving the time by at most `limit`. False when the limit came first.
  bool runUntil(FunctionRef<bool()> done, Duration limit = 1h);
  // How far away the next task is; zero for one that is due, none when nothing is to come.
  std::optional<Duration> nextDelay() const;
  // How many tasks wait, delayed ones included.
  std::size_t pendingCount() const;
  // From now on the main queue is as quick as a thread of its own can be: what is posted to it runs
  // before its poster goes on, unless the main queue is busy.
  void letMainRunAtOnce();
  // Makes the wall clock jump; the steady one does not notice.
  void setWall(WallTime time);

  // Clock
  SteadyTime now() const override;
  WallTime wallNow() const override;
  SteadyTime realNow() const override { return now(); }

  // WorkQueues
  std::unique_ptr<SerialQueue> makeSerialQueue(
      std::string label, QualityOfService quality = QualityOfService::Default) override;
  std::unique_ptr<ConcurrentQueue> makeConcurrentQueue(std::string label) override;
  WorkQueue& global(QualityOfService quality) override;
  SerialQueue& main() override { return *main_; }
  std::unique_ptr<Semaphore> makeSemaphore(unsigned permits) override;
  std::unique_ptr<Group> makeGroup() override;
  std::unique_ptr<Timer> makeTimer(WorkQueue& queue, Task task) override;

 private:
  const std::shared_ptr<TimelineCore> core_;
  const std::unique_ptr<SerialQueue> main_;
  std::array<std::unique_ptr<WorkQueue>, 4> globals_;
  Duration wallOffset_;
};

}  // namespace zelkord
