#include "platform/linux/memory_pressure/LinuxMemoryPressure.h"

#include <utility>

namespace zelkord {

// Shared with the watch and with subscriptions.
struct LinuxMemoryPressure::Listeners {
  struct Listener {
    WorkQueue* queue;
    std::shared_ptr<const Task> task;
  };
  Mutex mutex;
  std::uint64_t nextId ZK_GUARDED_BY(mutex) = 0;
  std::map<std::uint64_t, Listener> byId ZK_GUARDED_BY(mutex);
  std::unique_ptr<PressureWatch> watch ZK_GUARDED_BY(mutex);

  // Under the mutex: a listener that cancels is gone when its queue may be.
  void tellAll() {
    const MutexLock lock(mutex);
    for (const auto& [id, listener] : byId) {
      listener.queue->async([task = std::weak_ptr(listener.task)] {
        if (const auto alive = task.lock()) (*alive)();
      });
    }
  }

  // The watch stays: closing a trigger takes the kernel longer than sleeping with it ever would.
  void remove(std::uint64_t id) {
    std::shared_ptr<const Task> released;  // after the lock: its captures may cancel in turn
    const MutexLock lock(mutex);
    const auto found = byId.find(id);
    if (found == byId.end()) return;
    released = std::move(found->second.task);
    byId.erase(found);
  }
};

LinuxMemoryPressure::LinuxMemoryPressure(Loop& host, LogSink& log, std::string pressureFile)
    : host_(host),
      log_(log, "default"),
      pressureFile_(std::move(pressureFile)),
      listeners_(std::make_shared<Listeners>()) {}

LinuxMemoryPressure::~LinuxMemoryPressure() {
  std::unique_ptr<PressureWatch> ended;
  const MutexLock lock(listeners_->mutex);
  ended = std::move(listeners_->watch);
}

Subscription LinuxMemoryPressure::onCritical(WorkQueue& queue, Task task) {
  std::uint64_t id = 0;
  {
    const MutexLock lock(listeners_->mutex);
    id = listeners_->nextId++;
    listeners_->byId[id] = {&queue, std::make_shared<const Task>(std::move(task))};
    if (!listeners_->watch) _watch();
  }
  return Subscription([listeners = listeners_, id] { listeners->remove(id); });
}

void LinuxMemoryPressure::_watch() ZK_NO_ANALYSIS {
  const auto critical = [weak = std::weak_ptr(listeners_)] {
    if (const auto listeners = weak.lock()) listeners->tellAll();
  };
  listeners_->watch = watchKernelPressure(host_, pressureFile_.c_str(), critical);
  if (listeners_->watch) return;
  listeners_->watch =
      watchLowMemoryMonitor(host_, critical, [log = log_, wasLogged = false]() mutable {
        if (!std::exchange(wasLogged, true))
          log.info("this system does not tell about memory pressure");
      });
}

}  // namespace zelkord
