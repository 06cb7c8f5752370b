#pragma once

#include <functional>
#include <memory>

#include "platform/linux/bus/SystemBusListener.h"

namespace zelkord {

// One source of critical memory pressure, watched until it is destroyed, which waits for a
// call-back that runs; not on the loop, which outlives it.
class PressureWatch {
 public:
  virtual ~PressureWatch() = default;
};

// The kernel's own: all tasks stalled on memory for 100 ms within 2 s. Null where the kernel
// refuses the trigger. `critical` runs on the loop.
std::unique_ptr<PressureWatch> watchKernelPressure(Loop& loop, const char* path,
                                                   std::function<void()> critical);

// The system bus's LowMemoryMonitor, level 255, however often the bus goes and comes back. Both
// call-backs run on the loop; `missing` each time that there is no bus any more.
std::unique_ptr<PressureWatch> watchLowMemoryMonitor(Loop& loop, std::function<void()> critical,
                                                     std::function<void()> missing);

}  // namespace zelkord
