#pragma once

#include <functional>
#include <memory>

#include "platform/api/CountedTransactions.h"
#include "platform/api/WorkQueues.h"

namespace zelkord {

// Calls a hook, once, when no transaction has been open for a while.
//
// While transactions come and go nothing is armed anew: the timer looks every `limit` at most, and
// while one stays open it waits for its end instead.
//
// Threading: the hook runs on a queue of this object. Ownership: `transactions` and `clock` outlive
// it.
class ExitWhenIdle final {
 public:
  // `limit` is scaled time. The hook must not destroy this object.
  ExitWhenIdle(WorkQueues& queues, const Clock& clock, CountedTransactions& transactions,
               Duration limit, std::function<void()> hook);
  ExitWhenIdle(const ExitWhenIdle&) = delete;
  ExitWhenIdle& operator=(const ExitWhenIdle&) = delete;

 private:
  void _look();

  // Queue state; goes last.
  std::function<void()> hook_ ZK_ON(queue_);

  // Fixed after construction.
  const Clock& clock_;
  CountedTransactions& transactions_;
  const Duration limit_;
  const std::unique_ptr<SerialQueue> queue_;
  const std::shared_ptr<Timer> timer_;
};

}  // namespace zelkord
