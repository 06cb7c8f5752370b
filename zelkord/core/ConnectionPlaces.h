#pragma once

#include <cstddef>
#include <deque>
#include <functional>
#include <memory>
#include <optional>

#include "base/Subscription.h"
#include "platform/api/WorkQueues.h"

namespace zelkord {

// A fixed number of places for connections. Who finds none waits for one for at most 100 ms of real
// time; nobody's thread waits.
//
// Threading: `take` on any thread; decisions run on the places' own queue. A place is given back by
// destroying it, on any thread. Ownership: places may outlive this object.
class ConnectionPlaces final : public std::enable_shared_from_this<ConnectionPlaces> {
 public:
  // Gets the place, or nothing when none became free in time.
  using Decision = std::function<void(std::optional<Subscription> place)>;

  ConnectionPlaces(WorkQueues& queues, std::size_t places);

  void take(Decision decide);

 private:
  struct Waiter {
    std::uint64_t id;
    Decision decide;
    Subscription timeout;
  };
  void _take(const Decision& decide);
  void _wait(const Decision& decide);
  void _giveBack();
  void _timeOut(std::uint64_t id);
  Subscription _place();

  const std::unique_ptr<SerialQueue> queue_;

  // Queue state.
  std::size_t free_ ZK_ON(queue_);
  std::uint64_t nextId_ ZK_ON(queue_) = 0;
  std::deque<Waiter> waiters_ ZK_ON(queue_);
};

}  // namespace zelkord
