#include "platform/linux/url/CurlPartitions.h"

#include <algorithm>
#include <utility>

namespace zelkord {
namespace {

constexpr std::size_t kMaximumPartitions = 8;
// Requests of an identity that ended longer ago are not under way any more.
constexpr std::size_t kMaximumEnded = 64;
constexpr long kLeastIdleConnections = 2;

}  // namespace

CurlPartitions::CurlPartitions(Loop& loop, CurlSettings settings)
    : loop_(loop), settings_(std::move(settings)) {}

void CurlPartitions::begin(std::shared_ptr<CurlURLTask> task, CurlURLTask::Order order,
                           TransferPlace place) {
  loop_.assertCurrent();
  if (closed_) return;
  std::erase_if(retired_, [](const auto& connections) { return connections->isClosed(); });
  if (_isPast(order)) {
    retired_.push_back(_make());
    retired_.back()->begin(std::move(task), std::move(order), std::move(place));
    retired_.back()->retire();
    return;
  }
  auto& connections = _connectionsFor(order);
  connections.begin(std::move(task), std::move(order), std::move(place));
}

bool CurlPartitions::_isPast(const CurlURLTask::Order& order) const {
  if (order.identity.empty()) return order.endings != endings_;
  return std::ranges::find(ended_, order.identity) != ended_.end();
}

CurlConnections& CurlPartitions::_connectionsFor(const CurlURLTask::Order& order) {
  const auto& identity = order.identity;
  if (identity.empty()) return live_.empty() ? _add(identity) : *live_.back().connections;
  auto found = std::ranges::find(live_, identity, &Partition::identity);
  if (found == live_.end()) found = std::ranges::find(live_, "", &Partition::identity);
  if (found == live_.end()) return _add(identity);
  found->identity = identity;
  std::rotate(found, found + 1, live_.end());
  return *live_.back().connections;
}

CurlConnections& CurlPartitions::_add(const std::string& identity) {
  if (live_.size() >= kMaximumPartitions) _retire(live_.begin());
  live_.push_back({identity, _make()});
  _shareIdleConnections();
  return *live_.back().connections;
}

std::shared_ptr<CurlConnections> CurlPartitions::_make() const {
  return std::make_shared<CurlConnections>(loop_, settings_);
}

void CurlPartitions::_shareIdleConnections() {
  const auto share = settings_.maximumIdleConnections / static_cast<long>(live_.size());
  for (const auto& partition : live_) {
    partition.connections->setMaximumIdle(std::max(share, kLeastIdleConnections));
  }
}

void CurlPartitions::_retire(Partitions::iterator partition) {
  auto connections = std::move(partition->connections);
  live_.erase(partition);
  connections->retire();
  if (!connections->isClosed()) retired_.push_back(std::move(connections));
}

void CurlPartitions::endIdentity(const std::string& identity) {
  loop_.assertCurrent();
  ++endings_;
  ended_.push_back(identity);
  if (ended_.size() > kMaximumEnded) ended_.pop_front();
  for (const auto& name : {identity, std::string()}) {
    const auto found = std::ranges::find(live_, name, &Partition::identity);
    if (found != live_.end()) _retire(found);
  }
}

void CurlPartitions::cancel(CurlURLTask& task) {
  loop_.assertCurrent();
  const auto cancels = [&task](const auto& connections) { return connections->cancel(task); };
  if (std::ranges::any_of(live_, cancels, &Partition::connections)) return;
  (void)std::ranges::any_of(retired_, cancels);
}

std::vector<std::shared_ptr<CurlURLTask>> CurlPartitions::close() {
  loop_.assertCurrent();
  closed_ = true;
  for (auto& partition : live_) retired_.push_back(std::move(partition.connections));
  live_.clear();
  std::vector<std::shared_ptr<CurlURLTask>> dropped;
  for (const auto& connections : retired_) {
    auto tasks = connections->close();
    dropped.insert(dropped.end(), tasks.begin(), tasks.end());
  }
  retired_.clear();
  return dropped;
}

}  // namespace zelkord
