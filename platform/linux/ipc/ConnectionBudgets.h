#pragma once

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <list>
#include <optional>

#include "base/Subscription.h"
#include "platform/api/Budget.h"

namespace zelkord::ipc {

// How many connections there are, in all and of one process, on every door; and who makes room.
//
// A socket counts from the moment it is accepted. While it is unauthenticated it may have to go:
// when its process has no room for another, the oldest of that process; when nobody has, or when
// too many are unauthenticated, the oldest of the process that has most of them.
//
// Threading: the loop; shares are given back on any thread. Ownership: the reports outlive it.
class ConnectionBudgets final {
 public:
  struct Size {
    std::uint64_t connections = 0;  // in all; a process has a quarter, or half when it is alone
    std::size_t unauthenticated = 0;
    std::uint64_t busCallers = 0;
  };
  // What fits into a process that may have so many descriptors. Half of them are for connections;
  // the rest is for transfers, files and the moment.
  static Size sizeFor(std::uint64_t descriptors);

  ConnectionBudgets(Size size, LimitReports& reports);

  // A place for a connection of that process; nothing when there is none to be had.
  std::optional<Budget::Share> take(pid_t pid);
  // A place for a caller on the bus, connected or not.
  std::optional<Budget::Share> takeBusCaller(pid_t pid);
  // Until the subscription ends, `leave` may be called, once, to make room; it ends the
  // subscription.
  Subscription awaitAuthentication(pid_t pid, std::function<void()> leave);
  // Makes room for one descriptor. False: nobody has been unauthenticated for that long.
  bool evictOldest(std::chrono::milliseconds minimumAge);
  std::uint64_t mostBusCallers() const { return busCallers_.size().inAll; }

 private:
  struct Guest {
    pid_t pid;
    std::function<void()> leave;
    std::chrono::steady_clock::time_point since = std::chrono::steady_clock::now();
  };
  bool _evictOldestOf(pid_t pid);
  bool _evictFromTheLargest();
  bool _evict(std::list<Guest>::iterator guest);

  const std::size_t mostUnauthenticated_;
  LimitReports& reports_;
  Budget connections_;
  Budget busCallers_;
  std::list<Guest> guests_;  // oldest first
};

}  // namespace zelkord::ipc
