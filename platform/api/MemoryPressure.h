#pragma once

#include "base/Subscription.h"
#include "platform/api/WorkQueue.h"

namespace zelkord {

// Tells when memory runs out.
class MemoryPressure {
 public:
  virtual ~MemoryPressure() = default;
  // Runs the task on `queue` whenever the pressure becomes critical. Where the host cannot tell,
  // never.
  virtual Subscription onCritical(WorkQueue& queue, Task task) = 0;
};

}  // namespace zelkord
