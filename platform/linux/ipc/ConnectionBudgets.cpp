#include "platform/linux/ipc/ConnectionBudgets.h"

#include <algorithm>
#include <map>
#include <utility>

namespace zelkord::ipc {
namespace {

// What a connection takes besides its descriptor is not free either.
constexpr std::uint64_t kMostConnections = 4096;
constexpr std::uint64_t kLeastUnadmitted = 16;

}  // namespace

ConnectionBudgets::Size ConnectionBudgets::sizeFor(std::uint64_t descriptors) {
  const auto connections = std::min(descriptors / 2, kMostConnections);
  return {connections, connections / 2, std::max(connections / 8, kLeastUnadmitted),
          connections * 2};
}

ConnectionBudgets::ConnectionBudgets(Size size, LimitReports& reports)
    : mostUnauthenticated_(size.unauthenticated),
      reports_(reports),
      connections_("connections", Budget::halvedWhenAlone(size.connections), reports),
      unadmitted_("unadmitted_connections", Budget::halvedWhenAlone(size.unadmitted), reports),
      busCallers_("bus_callers", Budget::halvedWhenAlone(size.busCallers), reports) {}

std::optional<Budget::Share> ConnectionBudgets::take(pid_t pid) {
  const auto holder = processHolder(pid);
  if (auto share = connections_.take(holder)) return share;
  const bool hasItsShare = connections_.heldBy(holder) >= connections_.size().ofOneHolder;
  if (!(hasItsShare ? _evictOldestOf(pid) : _makeRoom())) return std::nullopt;
  return connections_.take(holder);
}

std::optional<Budget::Share> ConnectionBudgets::takeUnadmitted(pid_t pid) {
  return unadmitted_.take(processHolder(pid));
}

std::optional<Budget::Share> ConnectionBudgets::takeBusCaller(pid_t pid) {
  return busCallers_.take(processHolder(pid));
}

Subscription ConnectionBudgets::awaitAuthentication(pid_t pid, std::function<void()> leave) {
  if (guests_.size() >= mostUnauthenticated_) {
    reports_.refused("unauthenticated_connections", processHolder(pid));
    _evictFromTheLargest();
  }
  return _enter(guests_, pid, std::move(leave));
}

Subscription ConnectionBudgets::holdOpen(pid_t pid, std::function<void()> leave) {
  return _enter(open_, pid, std::move(leave));
}

Subscription ConnectionBudgets::_enter(std::list<Guest>& list, pid_t pid,
                                       std::function<void()> leave) {
  const auto place = list.insert(list.end(), Guest{.pid = pid, .leave = std::move(leave)});
  return Subscription([&list, place] { list.erase(place); });
}

bool ConnectionBudgets::evictOldest(std::chrono::milliseconds minimumAge) {
  const auto latest = std::chrono::steady_clock::now() - minimumAge;
  return !guests_.empty() && guests_.front().since <= latest && _evict(guests_.front());
}

bool ConnectionBudgets::_makeRoom() {
  return _evictFromOneOverItsShare() || _evictFromTheLargest();
}

// Who was alone may have kept more than its share since.
bool ConnectionBudgets::_evictFromOneOverItsShare() {
  const auto largest = connections_.largestHolder();
  if (!largest || connections_.heldBy(*largest) <= connections_.size().ofOneHolder) return false;
  const auto isIts = [&](const Guest& guest) { return processHolder(guest.pid) == *largest; };
  const auto guest = std::ranges::find_if(guests_, isIts);
  if (guest != guests_.end()) return _evict(*guest);
  const auto newest = std::find_if(open_.rbegin(), open_.rend(), isIts);
  return newest != open_.rend() && _evict(*newest);
}

bool ConnectionBudgets::_evictOldestOf(pid_t pid) {
  const auto guest = std::ranges::find(guests_, pid, &Guest::pid);
  return guest != guests_.end() && _evict(*guest);
}

bool ConnectionBudgets::_evictFromTheLargest() {
  std::map<pid_t, std::size_t> counts;
  for (const auto& guest : guests_) ++counts[guest.pid];
  // The first of the largest: among equals, whose guest is oldest.
  const auto guest = std::ranges::max_element(
      guests_, {}, [&](const Guest& candidate) { return counts[candidate.pid]; });
  return guest != guests_.end() && _evict(*guest);
}

bool ConnectionBudgets::_evict(Guest& guest) {
  const auto leave = std::move(guest.leave);  // the guest goes with its subscription
  leave();
  return true;
}

}  // namespace zelkord::ipc
