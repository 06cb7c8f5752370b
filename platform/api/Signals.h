#pragma once

#include "base/Subscription.h"
#include "platform/api/WorkQueue.h"

namespace zelkord {

// Signals as tasks. While a subscription lives, the signal does nothing but run its task.
class Signals {
 public:
  virtual ~Signals() = default;
  virtual Subscription on(int signal, WorkQueue& queue, Task task) = 0;
};

// How the process ends.
class ProcessControl {
 public:
  virtual ~ProcessControl() = default;
  // Saves counters, flushes the log and ends the process. Tests record it instead.
  virtual void exit(int status) = 0;
  // Runs the main queue's tasks for ever.
  virtual void runMainLoop() = 0;
  // Gives memory that the process holds and does not use back to the system. Any thread; may take
  // some milliseconds.
  virtual void releaseFreeMemory() = 0;
};

}  // namespace zelkord
