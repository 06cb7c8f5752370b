#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "base/FunctionRef.h"
#include "base/Time.h"
#include "platform/api/WorkQueue.h"

namespace zelkord {

// The inside of a ManualTimeline: virtual time, the agenda of all its queues, and who runs at the
// moment. Queues and timers share it, so that they may outlive the timeline.
//
// A task that waits runs the agenda from within; tasks of queues that are busy further out are held
// back until those are free again.
//
// Threading: one thread, the one that made it; another one's use stops the process.
class TimelineCore final {
 public:
  enum class Access { Shared, Exclusive };

  // What the core knows of one queue.
  struct Queue {
    std::string label;
    bool global = false;
    bool runsAtOnce = false;  // what is posted runs before its poster goes on, if it may
    int sharedRunning = 0;
    bool exclusiveRunning = false;
  };
  using QueuePointer = std::shared_ptr<Queue>;
  // A place on the agenda.
  using Key = std::pair<SteadyTime, std::uint64_t>;

  TimelineCore() = default;
  TimelineCore(const TimelineCore&) = delete;
  TimelineCore& operator=(const TimelineCore&) = delete;

  SteadyTime now() const { return now_; }

  Key post(const QueuePointer& queue, Duration delay, Access access, Task task);
  void cancel(Key key);
  // Forgets the tasks of a queue; of all with null.
  void drop(const Queue* queue);

  // Runs what stands on the agenda of that queue before it, then the task, inline.
  void sync(const QueuePointer& queue, Access access, FunctionRef<void()> task);
  // On the queue, directly or through `sync`; with Exclusive: in an exclusive task of it.
  bool isCurrent(const Queue& queue, Access access) const;

  // Runs the agenda until `ready`, moving time forward up to `deadline` but no further. False when
  // the deadline came first. Without anything left to run before an endless deadline the process
  // stops.
  bool pump(FunctionRef<bool()> ready, SteadyTime deadline);
  // Runs everything due by `limit`, moving time with it; leaves the time at what ran last.
  void runDue(SteadyTime limit);
  // Moves the time forward without running anything.
  void moveTo(SteadyTime time);

  // Null with an empty agenda.
  const Key* next() const { return agenda_.empty() ? nullptr : &agenda_.begin()->first; }
  std::size_t count() const { return agenda_.size(); }

 private:
  struct Entry {
    QueuePointer queue;
    Access access;
    Task task;
  };
  using Agenda = std::map<Key, Entry>;
  struct Frame {
    QueuePointer queue;
    Access access;
    bool startsChain;  // what is further out is another task that waits, not the caller
  };

  void _checkThread() const;
  static bool _isFree(const Queue& queue, Access access);
  Agenda::iterator _runnable(SteadyTime limit);
  Agenda::iterator _firstOf(const Queue& queue, Key before);
  void _runAllDue(const Queue& queue);
  void _run(Agenda::iterator place, bool startsChain);
  void _enter(Frame frame);
  void _leave();

  const std::thread::id thread_ = std::this_thread::get_id();
  SteadyTime now_{1000s};
  std::uint64_t nextSequence_ = 0;
  Agenda agenda_;
  std::vector<Frame> frames_;
};

}  // namespace zelkord
