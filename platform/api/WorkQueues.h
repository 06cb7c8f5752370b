#pragma once

#include <memory>
#include <string>

#include "platform/api/WorkQueue.h"

namespace zelkord {

// A counting semaphore. A thread that waits is compensated by another one, so waiting never starves
// the rest.
class Semaphore {
 public:
  virtual ~Semaphore() = default;
  virtual void signal(unsigned permits = 1) = 0;
  // Takes a permit, waiting for it for at most `timeout` of real time. False when none came.
  virtual bool wait(Duration timeout) = 0;
};

// Counts work under way: `leave` once for each `enter`.
class Group {
 public:
  virtual ~Group() = default;
  virtual void enter() = 0;
  virtual void leave() = 0;
  // Waits until nothing is under way, for at most `timeout` of real time. False when something
  // still is.
  virtual bool wait(Duration timeout) = 0;
};

// A timer that is armed again and again at no cost worth naming; each arming replaces the one
// before. It may fire up to `leeway` late, so that wake-ups fall together. Destroying it cancels.
class Timer {
 public:
  virtual ~Timer() = default;
  virtual void arm(Duration delay, Duration leeway) = 0;
  virtual void cancel() = 0;
};

// Makes queues, timers and what threads wait on.
class WorkQueues {
 public:
  virtual ~WorkQueues() = default;
  virtual std::unique_ptr<SerialQueue> makeSerialQueue(
      std::string label, QualityOfService quality = QualityOfService::Default) = 0;
  virtual std::unique_ptr<ConcurrentQueue> makeConcurrentQueue(std::string label) = 0;
  // Shared concurrent queues without barriers; a `sync` there simply runs the task.
  virtual WorkQueue& global(QualityOfService quality) = 0;
  // The queue of the main thread's run loop.
  virtual SerialQueue& main() = 0;
  virtual std::unique_ptr<Semaphore> makeSemaphore(unsigned permits) = 0;
  virtual std::unique_ptr<Group> makeGroup() = 0;
  // The task runs on `queue`, which must outlive the timer. Scaled time.
  virtual std::unique_ptr<Timer> makeTimer(WorkQueue& queue, Task task) = 0;
};

}  // namespace zelkord
