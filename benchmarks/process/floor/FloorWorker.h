#pragma once

#include <sys/eventfd.h>
#include <systemd/sd-bus.h>
#include <unistd.h>

#include <condition_variable>
#include <mutex>
#include <thread>
#include <utility>
#include <vector>

namespace zelkord::bench {

// The thread that "answers": a call goes to it and comes back by a wake-up of the loop.
//
// Threading: give and take on the loop's thread. The worker never touches a message, which belong
// to the loop. Lives as long as the program.
class FloorWorker {
 public:
  FloorWorker() : wakeUp_(::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {
    std::thread([this] { _run(); }).detach();
  }
  FloorWorker(const FloorWorker&) = delete;
  FloorWorker& operator=(const FloorWorker&) = delete;

  // Readable when there is something to take.
  int wakeUp() const { return wakeUp_; }

  void give(sd_bus_message* call) {
    {
      const std::lock_guard lock(mutex_);
      given_.push_back(call);
    }
    arrived_.notify_one();
  }

  std::vector<sd_bus_message*> take() {
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
      done_.insert(done_.end(), given_.begin(), given_.end());
      given_.clear();
      lock.unlock();
      ::eventfd_write(wakeUp_, 1);
      lock.lock();
    }
  }

  const int wakeUp_;
  std::mutex mutex_;
  std::condition_variable arrived_;
  std::vector<sd_bus_message*> given_;
  std::vector<sd_bus_message*> done_;
};

}  // namespace zelkord::bench
