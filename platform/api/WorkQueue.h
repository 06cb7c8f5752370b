#pragma once

#include <functional>
#include <string>

#include "base/FunctionRef.h"
#include "base/Namespace.h"
#include "base/Subscription.h"
#include "base/ThreadSafety.h"
#include "base/Time.h"

namespace zelkord {

using Task = std::function<void()>;

// Whether a delay follows the daemon's clock (and its simulation rate) or the real one.
enum class TimeBase { Scaled, Real };

// How urgent tasks are; higher ones begin first.
enum class QualityOfService { Background, Utility, Default, High };

// Where tasks run. Tasks given to `async` run later, in order, never inline; `sync` returns after
// its task has run and runs it on the caller's own thread, without a thread switch when the queue
// is idle.
//
// Threading: every operation on any thread; `sync` on a queue that the caller is on already is a
// deadlock and stops the process. What one task wrote, the next one sees. Ownership: destroying a
// queue drops the tasks that have not begun, and waits for the one that runs (unless it is the
// caller's own).
class ZK_CAPABILITY("queue") WorkQueue {
 public:
  virtual ~WorkQueue() = default;
  virtual void async(Task task) = 0;
  virtual void sync(FunctionRef<void()> task) = 0;
  // Runs the task once `delay` has passed, unless the subscription is gone by then.
  virtual Subscription after(Duration delay, Task task, TimeBase base = TimeBase::Scaled) = 0;
  virtual bool isCurrent() const = 0;
  virtual const std::string& label() const = 0;

  // Stops the process when the caller is not on this queue.
  void assertCurrent() const ZK_ASSERTS(this);
};

// One task at a time, in order.
class ZK_CAPABILITY("queue") SerialQueue : public WorkQueue {
 public:
  // From now on its turns are that urgent; turns of queues that have no threads are not.
  virtual void setQuality(QualityOfService) {}
};

// Tasks run side by side, except barrier tasks: one begins after everything before it has ended,
// and what comes later waits for it.
class ZK_CAPABILITY("queue") ConcurrentQueue : public WorkQueue {
 public:
  virtual void barrierAsync(Task task) = 0;
  virtual void barrierSync(FunctionRef<void()> task) = 0;
  virtual bool isBarrierCurrent() const = 0;

  // For reading members: on the queue, in whichever kind of task.
  void assertReading() const ZK_ASSERTS_SHARED(this);
  // For writing members: in a barrier task.
  void assertBarrier() const ZK_ASSERTS(this);
};

}  // namespace zelkord
