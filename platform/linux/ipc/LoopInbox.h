#pragma once

#include <memory>
#include <vector>

#include "base/Mutex.h"
#include "platform/api/WorkQueue.h"
#include "platform/linux/ipc/OwnedFd.h"

namespace zelkord::ipc {

// Tasks on their way to the loop's thread, many a wake-up.
//
// Threading: `post` on any thread; the rest on the loop's.
// Ownership: shared with everything that may answer late; once closed, tasks are dropped.
class LoopInbox {
 public:
  LoopInbox();

  void post(Task task);
  // Readable while there are tasks.
  int descriptor() const { return wakeUp_.get(); }
  // Everything posted since the last time.
  std::vector<Task> take();
  std::vector<Task> close();

 private:
  const OwnedFd wakeUp_;
  Mutex mutex_;
  std::vector<Task> tasks_ ZK_GUARDED_BY(mutex_);
  bool closed_ ZK_GUARDED_BY(mutex_) = false;
};

}  // namespace zelkord::ipc
