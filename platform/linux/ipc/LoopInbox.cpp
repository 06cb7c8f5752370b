#include "platform/linux/ipc/LoopInbox.h"

#include <sys/eventfd.h>

#include <utility>

#include "base/Check.h"

namespace zelkord::ipc {

LoopInbox::LoopInbox() : wakeUp_(::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {
  ZK_CHECK(wakeUp_, "no eventfd for the IPC thread");
}

void LoopInbox::post(Task task) {
  {
    const MutexLock lock(mutex_);
    if (closed_) return;
    tasks_.push_back(std::move(task));
    if (tasks_.size() > 1) return;  // whoever posted the first one has woken the loop
  }
  ::eventfd_write(wakeUp_.get(), 1);
}

std::vector<Task> LoopInbox::take() {
  eventfd_t count = 0;
  ::eventfd_read(wakeUp_.get(), &count);
  const MutexLock lock(mutex_);
  return std::exchange(tasks_, {});
}

std::vector<Task> LoopInbox::close() {
  const MutexLock lock(mutex_);
  closed_ = true;
  return std::exchange(tasks_, {});
}

}  // namespace zelkord::ipc
