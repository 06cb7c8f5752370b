#pragma once

#include <poll.h>

#include <atomic>
#include <chrono>
#include <functional>
#include <thread>
#include <vector>

#include "base/Mutex.h"
#include "base/ThreadSafety.h"

namespace zelkor {

using ClientTime = std::chrono::steady_clock::time_point;

// What the loop waits for.
struct LoopWait {
  std::vector<pollfd> descriptors;
  ClientTime deadline = ClientTime::max();

  void until(ClientTime time) {
    if (time < deadline) deadline = time;
  }
};

// The one thread of a client: it runs tasks, and a turn of work after each wake-up.
//
// States: made; running after start(); joined after finish().
// Threading: post and finish on any other thread; everything else that belongs to the loop runs on
// its thread and says so with assertCurrent.
class ZK_CAPABILITY("thread") ClientLoop {
 public:
  // `turn` does what the descriptors and deadlines ask for, and says what to wait for next.
  explicit ClientLoop(std::function<LoopWait()> turn);
  ~ClientLoop();

  void start();
  void post(std::function<void()> task);
  // Runs the tasks that were posted, then `last`, and ends the thread. Not on the loop's own
  // thread.
  void finish(std::function<void()> last);

  void assertCurrent() const ZK_ASSERTS(this);

 private:
  void _run();
  void _runTasks();
  void _wait(LoopWait wait) const;
  void _wake() const;

  const std::function<LoopWait()> turn_;
  const int wakeUp_;  // eventfd

  Mutex mutex_;
  std::vector<std::function<void()>> tasks_ ZK_GUARDED_BY(mutex_);

  bool stopped_ = false;  // loop thread
  std::atomic<std::thread::id> current_;
  std::thread thread_;
};

}  // namespace zelkor
