#pragma once

#include <cstdint>
#include <deque>
#include <map>
#include <memory>
#include <thread>
#include <vector>

#include "base/CondVar.h"
#include "base/FunctionRef.h"
#include "base/Mutex.h"
#include "base/Subscription.h"
#include "base/Time.h"
#include "platform/api/WorkQueue.h"
#include "platform/linux/loop/CarriedWork.h"
#include "platform/linux/loop/LoopCrew.h"
#include "platform/linux/loop/LoopInbox.h"
#include "platform/linux/loop/LoopTimers.h"
#include "platform/linux/loop/LoopWatches.h"

namespace zelkord {

// Waits for descriptors, times and posted tasks, on one thread at a time, and sleeps while there
// are none. What is posted while it sleeps runs on the posting thread, when that is a service
// thread that leads no loop at the moment.
//
// States: not started (until the first `post` or `sync`), running, ended. Tasks run in the order in
// which they were posted; a post costs at most one wake-up, none when somebody has the loop.
//
// With a crew it has no thread of its own: whoever leads it may carry what was read to its end
// himself, see CarriedWork.
//
// Threading: `post`, `sync`, `stop`, `inbox` and `isCurrent` on any thread; everything else on the
// one that the loop belongs to: its leader, or one that runs posted tasks; before the start and
// after the end any one at a time. Ownership: outlives its subscriptions and timers; destroying it
// (not from its tasks) ends it. The crew outlives it.
class ZK_CAPABILITY("loop") Loop final : private LoopHost, private LedLoop {
 public:
  // Without a crew the loop has a thread of its own, which has the name, at most 15 bytes.
  explicit Loop(const char* name, LoopCrew* crew = nullptr);
  ~Loop() override;
  Loop(const Loop&) = delete;
  Loop& operator=(const Loop&) = delete;

  // False, with the task dropped, once the loop is stopped.
  bool post(Task task, LoopInbox::Runner runner = LoopInbox::Runner::Anybody);
  // Returns after the task has run where the loop's tasks run; inline when that is the caller's
  // thread, or the loop has ended.
  void sync(FunctionRef<void()> task);
  // Runs what is posted, then the tasks for the end, and ends the loop; the rest is dropped.
  void stop();
  // For those who may post late; nothing comes from it before the first `post` or `sync`.
  const std::shared_ptr<LoopInbox>& inbox() const { return inbox_; }
  bool isCurrent() const { return inbox_->isCurrent(); }
  // Stops the process when the loop belongs to another thread than the caller's.
  void assertCurrent() const ZK_ASSERTS(this);

  // Calls `ready` with epoll's events. The descriptor stays open until the subscription is gone.
  Subscription watch(int descriptor, std::uint32_t events, LoopWatches::Ready ready);
  // Replaces the events of a watched descriptor.
  void changeEvents(int descriptor, std::uint32_t events);
  Subscription after(Duration delay, Task task);
  // Runs the task after everything that is ready now has had its turn.
  void soon(Task task);
  // Runs the task when the others have had their turn too: of such tasks, in their order, only as
  // many begin between two looks at what is ready as fit into kSpareTime.
  void inSpareTime(Task task);
  // Runs the task before the loop ends, what came last first.
  Subscription atEnd(Task task);
  LoopTimers& timers();

 private:
  static constexpr Duration kSpareTime = 1ms;
  enum class State { NotStarted, Running, Stopping, Ended };

  // LoopHost
  void runPosted(std::vector<Task> tasks) override;
  bool needsOwnThread() override;

  // LedLoop
  Left lead() override;

  bool _start();
  bool _isRunning() const;
  bool _carry(WorkCarrier& carrier) ZK_REQUIRES(this);
  bool _goesAway() ZK_REQUIRES(this);
  void _wait() ZK_REQUIRES(this);
  void _work(std::vector<Task> tasks) ZK_REQUIRES(this);
  void _runInSpareTime() ZK_REQUIRES(this);
  void _end() ZK_REQUIRES(this);
  static void _runAll(std::vector<Task> tasks);

  // Fixed after construction.
  const char* const name_;
  const std::shared_ptr<LoopInbox> inbox_;
  LoopCrew* const crew_;

  mutable Mutex mutex_;
  CondVar changed_;  // a sync task has run, or the state has changed
  State state_ ZK_GUARDED_BY(mutex_) = State::NotStarted;
  std::thread thread_ ZK_GUARDED_BY(mutex_);

  // The loop's.
  bool stopping_ ZK_ON(this) = false;
  LoopWatches watches_ ZK_ON(this);
  LoopTimers timers_ ZK_ON(this);
  std::vector<Task> soon_ ZK_ON(this);
  std::deque<Task> inSpareTime_ ZK_ON(this);
  std::uint64_t lastEnding_ ZK_ON(this) = 0;
  std::map<std::uint64_t, Task> endings_ ZK_ON(this);

  const std::shared_ptr<LoopHelm> helm_;  // null without a crew
};

}  // namespace zelkord
