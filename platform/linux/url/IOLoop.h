#pragma once

#include <cstdint>
#include <thread>
#include <vector>

#include "base/CondVar.h"
#include "base/FunctionRef.h"
#include "base/Mutex.h"
#include "platform/api/WorkQueue.h"
#include "platform/linux/queues/LoopInbox.h"
#include "platform/linux/url/IOLoopClient.h"

namespace zelkord {

// One thread that waits for sockets, times and posted tasks, and sleeps when there are none. What
// is posted while it sleeps runs on the posting thread, when that is a service thread.
//
// States: not started (until the first `post`), running, stopped. Tasks run in the order in which
// they were posted; a post costs at most one wake-up, none when the thread is awake.
//
// Threading: `post`, `sync`, `stop` and `now` on any thread, the rest on the one that the loop
// belongs to: its own, on which signals are blocked, or one that runs posted tasks.
// Ownership: clients outlive their registration; `stop` ends all.
class ZK_CAPABILITY("thread") IOLoop final : private LoopHost {
 public:
  IOLoop();
  ~IOLoop() override;
  IOLoop(const IOLoop&) = delete;
  IOLoop& operator=(const IOLoop&) = delete;

  // False, without running the task, once the loop is stopped.
  bool post(Task task);
  // Returns after the task has run where the loop's tasks run; inline when that is the caller's
  // thread or there is none (any more).
  void sync(FunctionRef<void()> task);
  // Runs what is posted, tells the clients, and ends the thread. Not on the loop's thread.
  void stop();

  // Steady time, suspend included.
  static SteadyTime now();
  // Stops the process when the loop belongs to another thread than the caller's.
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

  // LoopHost
  void runPosted(std::vector<Task> tasks) override;
  bool needsOwnThread() override;

  bool _isStarted() const;
  bool _start();
  bool _isRunning() const;
  void _run();
  void _runDue() ZK_REQUIRES(this);
  void _waitAndDispatch() ZK_REQUIRES(this);
  // Sets the alarm clock for what is due next, unless it goes off before.
  void _setAlarm() ZK_REQUIRES(this);
  void _end() ZK_REQUIRES(this);

  // Fixed after construction.
  LoopInbox inbox_;
  const int epoll_;
  // One that may be set while somebody waits for it, other than a time-out.
  const int alarm_;

  mutable Mutex mutex_;
  CondVar changed_;  // a sync task has run, or the state has changed
  State state_ ZK_GUARDED_BY(mutex_) = State::NotStarted;
  std::thread thread_ ZK_GUARDED_BY(mutex_);

  // The loop's.
  SteadyTime alarmTime_ ZK_ON(this) = IOLoopClient::kNever;
  std::vector<IOLoopClient*> clients_ ZK_ON(this);
  std::vector<IOLoopClient*> watchers_ ZK_ON(this);  // by descriptor
};

}  // namespace zelkord
