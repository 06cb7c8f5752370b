#pragma once

#include <chrono>
#include <condition_variable>
#include <mutex>

#include "base/Mutex.h"
#include "base/Time.h"

namespace zelkor {

// A condition variable for Mutex. Waits may end for no reason: wait in a loop over the condition.
class CondVar {
 public:
  void wait(Mutex& mutex) ZK_REQUIRES(mutex) {
    std::unique_lock<std::mutex> held(mutex.mutex_, std::adopt_lock);
    condition_.wait(held);
    held.release();
  }
  // False when `deadline` has passed.
  bool waitUntil(Mutex& mutex, std::chrono::steady_clock::time_point deadline) ZK_REQUIRES(mutex) {
    std::unique_lock<std::mutex> held(mutex.mutex_, std::adopt_lock);
    const bool inTime = condition_.wait_until(held, deadline) == std::cv_status::no_timeout;
    held.release();
    return inTime;
  }
  void notifyOne() { condition_.notify_one(); }
  void notifyAll() { condition_.notify_all(); }

 private:
  std::condition_variable condition_;
};

// `timeout` from now on the clock of CondVar::waitUntil; a timeout beyond that clock's range is its
// end.
inline std::chrono::steady_clock::time_point waitDeadline(Duration timeout) {
  const auto now = std::chrono::steady_clock::now();
  const auto longest = std::chrono::steady_clock::time_point::max() - now;
  return timeout >= longest ? std::chrono::steady_clock::time_point::max() : now + timeout;
}

}  // namespace zelkor
