#pragma once

#include <array>
#include <cstdint>
#include <deque>
#include <functional>
#include <memory>
#include <optional>
#include <vector>

#include "base/CondVar.h"
#include "base/Mutex.h"
#include "base/Time.h"
#include "platform/api/WorkQueues.h"
#include "platform/linux/queues/Executor.h"
#include "platform/linux/queues/Parker.h"

namespace zelkord {

class WorkerPool;

// One thread of the pool.
class PoolWorker {
 public:
  explicit PoolWorker(WorkerPool& pool) : pool_(pool) {}

 private:
  friend class WorkerPool;

  WorkerPool& pool_;
  Parker parker_;
  std::optional<QualityOfService> quality_;  // of what it runs; guarded by the pool's mutex
  bool blocking_ = false;                    // the worker's own
};

// The threads that run the queues' tasks.
//
// A worker is running, blocked (inside a BlockingScope) or idle. At most `limit` run; a blocked one
// does not count, and its turn goes to another worker, made when none is idle. When it comes back
// there may be too many for a moment: whoever finishes first then goes idle. Workers are made on
// demand, at most kMaximumWorkers, and leave after kIdleLife without work, except for the last one,
// which sleeps for good: an idle pool wakes nobody.
//
// While kMaximumWaiting are blocked, waits that can do without are refused, so that the workers
// beyond them are left to what never waits: authentication, diagnostics, leaving.
//
// The highest quality that waits goes first, but every 16th turn goes to the lowest. Utility and
// Background together get at most `limit` - 1 workers, so that one is always free for the rest.
//
// Work of Default or High that the leader of a loop has submitted, and nobody else waits before, he
// carries out himself (see CarriedWork), beside the workers and without a place among them.
//
// Threading: any thread. `stop` drops what has not begun, and returns when the workers are gone and
// nothing is carried any more; it must not run on one.
// Errors: when no thread can be made, the work waits for a worker that becomes free.
class WorkerPool final : public Executor {
 public:
  static constexpr unsigned kMaximumWorkers = 2048;
  static constexpr unsigned kMaximumWaiting = 1024;
  static constexpr Duration kIdleLife = 5s;

  struct Counts {
    unsigned total = 0;
    unsigned running = 0;
    unsigned blocked = 0;
  };

  // Zero: as many as there are processors. At least 2.
  explicit WorkerPool(unsigned limit = 0, Duration idleLife = kIdleLife);
  ~WorkerPool() override;

  void submit(std::shared_ptr<QueueCore> core) override;
  void stop();

  unsigned limit() const { return limit_; }
  Counts counts() const;
  // Called at each refused wait, on its thread; null: nobody is told.
  void onRefusedWait(std::function<void()> report);

  // Null when the calling thread is no worker or is blocked already, and when its wait is refused,
  // which only one that asks `isRefused` can be.
  static PoolWorker* beginBlocking(bool* isRefused);
  static void endBlocking(PoolWorker& worker);

 private:
  using Ticket = std::shared_ptr<QueueCore>;
  class CarriedTicket;
  // Who is to be started once the mutex is free: an idle worker, a new one, or nobody.
  struct Start {
    PoolWorker* idle = nullptr;
    bool isNew = false;
  };

  bool _letCarry(const Ticket& ticket);
  void _endCarrying();
  void _place(Ticket ticket);
  void _run();
  Ticket _next(PoolWorker& worker);
  Ticket _tryTake(PoolWorker& worker, Start& start) ZK_REQUIRES(mutex_);
  bool _sleep(PoolWorker& worker);
  bool _mayLeave(PoolWorker& worker);
  std::optional<QualityOfService> _pick() const ZK_REQUIRES(mutex_);
  bool _mayStart(QualityOfService quality) const ZK_REQUIRES(mutex_);
  Start _startOne() ZK_REQUIRES(mutex_);
  bool _tryBlock(PoolWorker& worker, bool mayRefuse);
  void _reportRefusedWait();
  void _perform(Start start);
  void _count(const PoolWorker& worker, int change) ZK_REQUIRES(mutex_);

  // Fixed after construction.
  const unsigned limit_;
  const Duration idleLife_;

  mutable Mutex mutex_;
  CondVar gone_;
  std::array<std::deque<Ticket>, 4> ready_ ZK_GUARDED_BY(mutex_);  // by quality
  std::vector<PoolWorker*> idle_ ZK_GUARDED_BY(mutex_);            // the last one idles shortest
  Counts counts_ ZK_GUARDED_BY(mutex_);
  unsigned runningLow_ ZK_GUARDED_BY(mutex_) = 0;  // of those, with Utility or Background
  unsigned carried_ ZK_GUARDED_BY(mutex_) = 0;     // tickets that leaders of loops have
  std::uint64_t turn_ ZK_GUARDED_BY(mutex_) = 0;
  bool stopped_ ZK_GUARDED_BY(mutex_) = false;
  std::function<void()> reportRefusedWait_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
