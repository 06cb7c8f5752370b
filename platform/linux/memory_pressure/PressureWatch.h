#pragma once

#include <functional>
#include <memory>
#include <thread>

#include "platform/linux/bus/SystemBusListener.h"
#include "platform/linux/files/Descriptor.h"

namespace zelkord {

// One source of critical memory pressure, watched until it is destroyed.
class PressureWatch {
 public:
  virtual ~PressureWatch() = default;
};

// The kernel's own: all tasks stalled on memory for 100 ms within 2 s. Null where the kernel
// refuses the trigger. `critical` runs on a thread of the watch's own, which sleeps in between.
std::unique_ptr<PressureWatch> watchKernelPressure(const char* path,
                                                   std::function<void()> critical);

// The system bus's LowMemoryMonitor, level 255, however often the bus goes and comes back. Both
// call-backs run on a thread of the watch's own; `missing` each time that there is no bus any more.
std::unique_ptr<PressureWatch> watchLowMemoryMonitor(std::function<void()> critical,
                                                     std::function<void()> missing);

}  // namespace zelkord
