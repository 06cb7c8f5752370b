#pragma once

#include <atomic>
#include <cstdint>
#include <deque>
#include <memory>
#include <string>
#include <vector>

#include "base/CondVar.h"
#include "base/FunctionRef.h"
#include "base/Mutex.h"
#include "platform/api/WorkQueues.h"
#include "platform/linux/queues/Executor.h"

namespace zelkord {

class Parker;
class QueueFrame;

// The inside of every queue: who is in, who waits, in which order.
//
// Those inside are any number of shared ones or a single exclusive one. While nobody waits,
// entering and leaving is one atomic operation each (`word_`); as soon as somebody does, kWaiting
// is set, everybody goes through `mutex_`, and places are granted in the order of arrival. A place
// for a queued task becomes a ticket at the executor; a place for a `sync` wakes its thread, which
// runs the task itself.
//
// States: open, then closed, in which queued tasks are dropped and threads that wait in `sync` are
// still served.
//
// Threading: any thread.
// Ownership: shared by the queue object and the tickets under way.
class QueueCore final : public std::enable_shared_from_this<QueueCore> {
 public:
  enum class Access { Shared, Exclusive };

  QueueCore(std::shared_ptr<Executor> executor, std::string label, QualityOfService quality);
  QueueCore(const QueueCore&) = delete;
  QueueCore& operator=(const QueueCore&) = delete;

  const std::string& label() const { return label_; }
  QualityOfService quality() const { return quality_.load(std::memory_order_relaxed); }
  void setQuality(QualityOfService quality) { quality_.store(quality, std::memory_order_relaxed); }

  void async(Access access, Task task);
  void sync(Access access, FunctionRef<void()> task);
  // Whether the calling thread is in, directly or further out; with Exclusive: exclusively.
  bool isCurrent(Access least) const;
  // Drops what has not begun and waits for what has, except for the caller's own.
  void close();

  // For the executor: runs a task that has a place, and those that get one right after it, up to a
  // batch.
  void runTicket();
  // Instead, once the executor begins nothing any more: drops the task and what gets its place
  // after it, so that whoever waits for the queue gets in.
  void dropTicket();

 private:
  friend class QueueFrame;

  struct Item {
    Access access = Access::Exclusive;
    Task task;
    Parker* waiter = nullptr;  // a `sync`; it has no task here
  };
  // What is to be done once the mutex is free.
  struct Grants {
    std::vector<Parker*> waiters;
    unsigned tickets = 0;
    std::shared_ptr<QueueCore> core;  // set when there are tickets
  };

  bool _tryEnter(Access access);
  void _waitToEnter(Access access);
  void _leave(Access access);
  Grants _enqueue(Item item) ZK_REQUIRES(mutex_);
  bool _mayBegin(Access access) const ZK_REQUIRES(mutex_);
  Grants _grant() ZK_REQUIRES(mutex_);
  bool _takeGranted(Item& item);
  bool _finish(Item& item, bool mayGoOn);
  std::deque<Item> _dropTasks() ZK_REQUIRES(mutex_);
  static void _perform(Grants grants);
  static std::uint32_t _weight(Access access);

  // Fixed after construction.
  const std::shared_ptr<Executor> executor_;
  const std::string label_;

  // Own synchronisation.
  std::atomic<QualityOfService> quality_;
  // Number of shared ones inside, kExclusive, kWaiting.
  std::atomic<std::uint32_t> word_{0};

  Mutex mutex_;
  CondVar left_;
  std::deque<Item> pending_ ZK_GUARDED_BY(mutex_);  // in order of arrival
  std::deque<Item> granted_ ZK_GUARDED_BY(mutex_);  // have a place and wait for a thread
  bool closed_ ZK_GUARDED_BY(mutex_) = false;
};

}  // namespace zelkord
