#pragma once

#include <atomic>
#include <condition_variable>
#include <cstdint>
#include <thread>
#include <vector>

#include "base/FunctionRef.h"
#include "base/Mutex.h"
#include "platform/api/WorkQueue.h"
#include "platform/linux/url/IOLoopClient.h"

namespace zelkord {

// One thread that waits for sockets, times and posted tasks, and sleeps when there are none.
//
// States: not started (until the first `post`), running, stopped. Tasks run in the order in which
// they were posted; a post costs at most one wake-up, none when the thread is awake.
//
// Threading: `post`, `sync`, `stop` and `now` on any thread, the rest on the loop's own. Signals
// are blocked on that thread.
// Ownership: clients outlive their registration; `stop` ends all.
class ZK_CAPABILITY("thread") IOLoop final {
 public:
  IOLoop();
  ~IOLoop();
  IOLoop(const IOLoop&) = delete;
  IOLoop& operator=(const IOLoop&) = delete;

  // False, without running the task, once the loop is stopped.
  bool post(Task task);
  // Returns after the task has run on the loop's thread; inline when the caller is that thread or
  // there is none (any more).
  void sync(FunctionRef<void()> task);
  // Runs what is posted, tells the clients, and ends the thread. Not on the loop's thread.
  void stop();

  // Steady time, suspend included.
  static SteadyTime now();
  // Stops the process when another thread than the caller's is the loop's.
  void assertCurrent() const ZK_ASSERTS(this);

  void add(IOLoopClient& client) ZK_REQUIRES(this);
  // Also stops watching all its descriptors.
  void remove(IOLoopClient& client) ZK_REQUIRES(this);
  // Sets the events (EPOLLIN, EPOLLOUT) that are waited for.
  void watch(int descriptor, std::uint32_t events, IOLoopClient& client) ZK_REQUIRES(this);
  void unwatch(int descriptor) ZK_REQUIRES(this);
  void unwatchAll(const IOLoopClient& client) ZK_REQUIRES(this);

 private:
  enum class State { NotStarted, Running, Stopping, Stopped };

  bool _isStarted() const;
  void _run();
  bool _runPosted() ZK_REQUIRES(this);
  void _runDue() ZK_REQUIRES(this);
  void _waitAndDispatch() ZK_REQUIRES(this);
  int _waitMilliseconds() const ZK_REQUIRES(this);
  void _end() ZK_REQUIRES(this);
  bool _isOwnThread() const { return owner_ == std::this_thread::get_id(); }

  // Fixed after construction.
  const int epoll_;
  const int wakeUp_;

  mutable Mutex mutex_;
  std::condition_variable_any changed_;  // a sync task has run, or the state has changed
  State state_ ZK_GUARDED_BY(mutex_) = State::NotStarted;
  std::vector<Task> posted_ ZK_GUARDED_BY(mutex_);
  bool asleep_ ZK_GUARDED_BY(mutex_) = false;
  std::thread thread_ ZK_GUARDED_BY(mutex_);

  std::atomic<std::thread::id> owner_;  // of no thread while there is none

  // The loop's thread.
  std::vector<Task> running_ ZK_ON(this);
  std::vector<IOLoopClient*> clients_ ZK_ON(this);
  std::vector<IOLoopClient*> watchers_ ZK_ON(this);  // by descriptor
};

}  // namespace zelkord
