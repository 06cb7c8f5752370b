#pragma once

#include <atomic>
#include <thread>
#include <vector>

#include "base/CondVar.h"
#include "base/Mutex.h"
#include "platform/api/WorkQueue.h"
#include "platform/linux/system/Descriptor.h"

namespace zelkord {

// What belongs to one loop is touched by one thread at a time: its leader while he is awake and
// there, and while he sleeps or is away whoever posts something. That saves waking him and
// switching to him.
class LoopHost {
 public:
  virtual ~LoopHost() = default;
  // Runs the tasks, and what they leave to be done at once.
  virtual void runPosted(std::vector<Task> tasks) = 0;
  // Whether its leader must wake up: for what only he can do, or to sleep less long.
  virtual bool needsOwnThread() = 0;
};

// Tasks on their way to a loop, and the loop itself while its leader sleeps or is away.
//
// States: the loop's leader is awake and will look here before he sleeps; he sleeps or is away; the
// loop is lent meanwhile to a thread that has posted; closed, when tasks are dropped. Tasks run in
// the order in which they were posted, never from within another one. Only service threads that
// lead no loop at the moment are lent this one, for a bounded number of tasks; others wake its
// leader.
//
// Threading: `post` and `isCurrent` on any thread, the rest on the leader's.
// Ownership: shared with everything that may post late; the host lives until `close`.
class LoopInbox {
 public:
  explicit LoopInbox(LoopHost& host);
  LoopInbox(const LoopInbox&) = delete;
  LoopInbox& operator=(const LoopInbox&) = delete;

  // Who may run a task. What takes long goes on beside the poster's work, with the loop's leader.
  enum class Runner { Anybody, OwnThread };

  // False, with the task dropped, once closed. It may have run when this returns.
  bool post(Task task, Runner runner = Runner::Anybody);
  // Whether the calling thread is the one that the loop belongs to at the moment.
  bool isCurrent() const { return owner_.load() == std::this_thread::get_id(); }

  // An edge at each wake-up of the loop's leader, or of who follows him; there is nothing to read.
  int descriptor() const { return wakeUp_.get(); }
  // The calling thread leads the loop no more.
  void end() { owner_ = std::thread::id(); }
  std::vector<Task> take();
  // From here to `endSleep` nothing of the loop's may be touched. False when there are tasks.
  bool beginSleep();
  // The calling thread leads the loop from now on. Waits for the end of a loan.
  void endSleep();
  // What has come too late to be run by anybody else than the caller.
  std::vector<Task> close();

 private:
  enum class State { Awake, Asleep, Lent, Closed };

  void _runLent();
  bool _endLoan();

  // Fixed after construction.
  LoopHost& host_;
  const Descriptor wakeUp_;

  std::atomic<std::thread::id> owner_;
  Mutex mutex_;
  CondVar returned_;
  State state_ ZK_GUARDED_BY(mutex_) = State::Awake;
  bool awaited_ ZK_GUARDED_BY(mutex_) = false;  // the leader is up and waits for its return
  std::vector<Task> tasks_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
