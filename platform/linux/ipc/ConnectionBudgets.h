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
// when its process has its share and wants another, the oldest of that process; when all places are
// taken, or when too many are unauthenticated, the oldest of the process that has most of them.
// When all places are taken and a process has more than a quarter of them, because it was alone
// once, it makes room first: with its oldest unauthenticated one, else its newest connection.
//
// Sockets of a door whose delegate bounds its connections have places of their own until they are
// admitted; they never have to go.
//
// Threading: the loop; shares are given back on any thread. Ownership: the reports outlive it.
class ConnectionBudgets final {
 public:
  struct Size {
    std::uint64_t connections = 0;  // in all; a process has a quarter, or half when it is alone
    std::size_t unauthenticated = 0;
    std::uint64_t unadmitted = 0;
    std::uint64_t busCallers = 0;
  };
  // What fits into a process that may have so many descriptors. Half of them are for connections,
  // a 16th for sockets that are not admitted; the rest is for transfers, files and the moment.
  static Size sizeFor(std::uint64_t descriptors);

  ConnectionBudgets(Size size, LimitReports& reports);

  // A place for a connection of that process; nothing when there is none to be had.
  std::optional<Budget::Share> take(pid_t pid);
  // A place for a socket that the delegate may admit.
  std::optional<Budget::Share> takeUnadmitted(pid_t pid);
  // A place for a caller on the bus, connected or not.
  std::optional<Budget::Share> takeBusCaller(pid_t pid);
  // Until the subscription ends, `leave` may be called, once, to make room; it ends the
  // subscription and gives back the place.
  Subscription awaitAuthentication(pid_t pid, std::function<void()> leave);
  // The same of a connection that is open, for the case of a process with too many.
  Subscription holdOpen(pid_t pid, std::function<void()> leave);
  // Makes room for one descriptor. False: nobody has been unauthenticated for that long.
  bool evictOldest(std::chrono::milliseconds minimumAge);
  std::uint64_t mostBusCallers() const { return busCallers_.size().inAll; }

 private:
  struct Guest {
    pid_t pid;
    std::function<void()> leave;
    std::chrono::steady_clock::time_point since = std::chrono::steady_clock::now();
  };
  static Subscription _enter(std::list<Guest>& list, pid_t pid, std::function<void()> leave);
  // Each evicts one; false: there is none.
  bool _makeRoom();
  bool _evictFromOneOverItsShare();
  bool _evictOldestOf(pid_t pid);
  bool _evictFromTheLargest();
  bool _evict(Guest& guest);

  const std::size_t mostUnauthenticated_;
  LimitReports& reports_;
  Budget connections_;
  Budget unadmitted_;
  Budget busCallers_;
  std::list<Guest> guests_;  // unauthenticated, oldest first
  std::list<Guest> open_;    // oldest first
};

}  // namespace zelkord::ipc
