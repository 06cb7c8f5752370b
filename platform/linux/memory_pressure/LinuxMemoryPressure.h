#pragma once

#include <map>
#include <memory>
#include <string>

#include "base/Mutex.h"
#include "platform/api/Log.h"
#include "platform/api/MemoryPressure.h"
#include "platform/linux/memory_pressure/PressureWatch.h"

namespace zelkord {

// Critical memory pressure: the kernel's pressure-stall information, else the system bus's
// LowMemoryMonitor, else none until there is a bus, which is logged once. Watches from the first
// listener on, on the host's loop; nothing polls.
//
// Threading: any thread. Ownership: the loop outlives it; subscriptions may outlive it.
class LinuxMemoryPressure final : public MemoryPressure {
 public:
  LinuxMemoryPressure(Loop& host, LogSink& log, std::string pressureFile = "/proc/pressure/memory");
  ~LinuxMemoryPressure() override;

  Subscription onCritical(WorkQueue& queue, Task task) override;

 private:
  struct Listeners;
  void _watch();

  Loop& host_;
  const Logger log_;
  const std::string pressureFile_;
  const std::shared_ptr<Listeners> listeners_;
};

}  // namespace zelkord
