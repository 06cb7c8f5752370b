#pragma once

#include <memory>
#include <utility>

#include "base/Mutex.h"
#include "platform/api/WorkQueue.h"

namespace zelkord {

// A session's delegate queue, as long as the session lives; tasks may know it for longer.
//
// Threading: any thread. Errors: what comes after `close` is dropped.
class DelegateQueue final {
 public:
  explicit DelegateQueue(std::unique_ptr<SerialQueue> queue) : queue_(std::move(queue)) {}

  void async(Task task) {
    const MutexLock lock(mutex_);
    if (queue_) queue_->async(std::move(task));
  }
  // Drops what waits; returns when nothing runs, save the caller itself.
  void close() {
    std::unique_ptr<SerialQueue> queue;
    const MutexLock lock(mutex_);
    queue.swap(queue_);
  }

 private:
  Mutex mutex_;
  std::unique_ptr<SerialQueue> queue_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
