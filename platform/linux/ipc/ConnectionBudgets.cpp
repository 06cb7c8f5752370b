#include "platform/linux/ipc/ConnectionBudgets.h"

#include <algorithm>
#include <map>
#include <utility>

namespace zelkord::ipc {
namespace {

// What a connection takes besides its descriptor is not free either.
constexpr std::uint64_t kMostConnections = 4096;

}  // namespace

ConnectionBudgets::Size ConnectionBudgets::sizeFor(std::uint64_t descriptors) {
  const auto connections = std::min(descriptors / 2, kMostConnections);
  return {connections, connections / 2, connections * 2};
}

ConnectionBudgets::ConnectionBudgets(Size size, LimitReports& reports)
    : mostUnauthenticated_(size.unauthenticated),
      reports_(reports),
      connections_("connections", Budget::halvedWhenAlone(size.connections), reports),
      busCallers_("bus_callers", Budget::halvedWhenAlone(size.busCallers), reports) {}

std::optional<Budget::Share> ConnectionBudgets::take(pid_t pid) {
  const auto holder = processHolder(pid);
  if (auto share = connections_.take(holder)) return share;
  const bool isFull = connections_.held() >= connections_.size().inAll;
  if (!(isFull ? _evictFromTheLargest() : _evictOldestOf(pid))) return std::nullopt;
  return connections_.take(holder);
}

std::optional<Budget::Share> ConnectionBudgets::takeBusCaller(pid_t pid) {
  return busCallers_.take(processHolder(pid));
}

Subscription ConnectionBudgets::awaitAuthentication(pid_t pid, std::function<void()> leave) {
  if (guests_.size() >= mostUnauthenticated_) {
    reports_.refused("unauthenticated_connections", processHolder(pid));
    _evictFromTheLargest();
  }
  const auto guest = guests_.insert(guests_.end(), Guest{.pid = pid, .leave = std::move(leave)});
  return Subscription([this, guest] { guests_.erase(guest); });
}

bool ConnectionBudgets::evictOldest(std::chrono::milliseconds minimumAge) {
  const auto latest = std::chrono::steady_clock::now() - minimumAge;
  return !guests_.empty() && guests_.front().since <= latest && _evict(guests_.begin());
}

bool ConnectionBudgets::_evictOldestOf(pid_t pid) {
  return _evict(std::find_if(guests_.begin(), guests_.end(),
                             [pid](const Guest& guest) { return guest.pid == pid; }));
}

bool ConnectionBudgets::_evictFromTheLargest() {
  std::map<pid_t, std::size_t> counts;
  for (const auto& guest : guests_) ++counts[guest.pid];
  const auto largest =
      std::max_element(counts.begin(), counts.end(),
                       [](const auto& a, const auto& b) { return a.second < b.second; });
  return largest != counts.end() && _evictOldestOf(largest->first);
}

bool ConnectionBudgets::_evict(std::list<Guest>::iterator guest) {
  if (guest == guests_.end()) return false;
  const auto leave = std::move(guest->leave);  // the guest goes with its subscription
  leave();
  return true;
}

}  // namespace zelkord::ipc
