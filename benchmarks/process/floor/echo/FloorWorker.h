#pragma once

#include <sys/eventfd.h>
#include <unistd.h>

#include <algorithm>
#include <condition_variable>
#include <iterator>
#include <mutex>
#include <thread>
#include <utility>
#include <vector>

#include "corezelkor/client/internal/BusPointers.h"

namespace zelkord::bench {

// The thread that "answers": a call goes to it and comes back by a wake-up of the loop.
//
// Threading: give and take on the loop's thread. The worker never looks into a message, which
// belong to the loop. Lives as long as the program.
class FloorWorker {
 public:
  using Calls = std::vector<zelkor::MessagePointer>;

  FloorWorker() : wakeUp_(::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {
    std::thread([this] { _run(); }).detach();
  }
  FloorWorker(const FloorWorker&) = delete;
  FloorWorker& operator=(const FloorWorker&) = delete;

  // Readable when there is something to take.
  int wakeUp() const { return wakeUp_; }

  void give(zelkor::MessagePointer call) {
    {
      const std::lock_guard lock(mutex_);
      given_.push_back(std::move(call));
    }
    arrived_.notify_one();
  }

  Calls take() {
    eventfd_t count = 0;
    ::eventfd_read(wakeUp_, &count);
    const std::lock_guard lock(mutex_);
    return std::exchange(done_, {});
  }

 private:
  void _run() {
    std::unique_lock lock(mutex_);
    while (true) {
      arrived_.wait(lock, [this] { return !given_.empty(); });
      std::move(given_.begin(), given_.end(), std::back_inserter(done_));
      given_.clear();
      lock.unlock();
      ::eventfd_write(wakeUp_, 1);
      lock.lock();
    }
  }

  const int wakeUp_;
  std::mutex mutex_;
  std::condition_variable arrived_;
  Calls given_;
  Calls done_;
};

}  // namespace zelkord::bench
