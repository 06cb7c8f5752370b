#include "zelkord/network/DownloadLine.h"

#include <utility>

namespace zelkord {

bool DownloadLine::add(const std::string& host, Begin begin) {
  if (waiting_ >= kMostWaiting) return false;
  hosts_[host].waiting.push_back(std::move(begin));
  ++waiting_;
  return true;
}

void DownloadLine::ended(const std::string& host, Connections connections) {
  const auto found = hosts_.find(host);
  if (found == hosts_.end() || found->second.underWay == 0) return;
  auto& place = found->second;
  --underWay_;
  --place.underWay;
  if (connections == Connections::Shared) place.most = kMostOnSharedConnection;
  if (place.underWay == 0 && place.waiting.empty()) hosts_.erase(found);
}

std::vector<DownloadLine::Begin> DownloadLine::takeDue() {
  std::vector<Begin> due;
  while (auto* host = _nextHost()) {
    due.push_back(std::move(host->waiting.front()));
    host->waiting.pop_front();
    ++host->underWay;
    ++underWay_;
    --waiting_;
  }
  return due;
}

// A host that is passed over has something under way, so there are few of them.
DownloadLine::Host* DownloadLine::_nextHost() {
  if (underWay_ >= kMostUnderWay || waiting_ == 0) return nullptr;
  auto place = hosts_.upper_bound(lastHost_);
  for (std::size_t passed = 0; passed < hosts_.size(); ++passed, ++place) {
    if (place == hosts_.end()) place = hosts_.begin();
    auto& [name, host] = *place;
    if (host.waiting.empty() || host.underWay >= host.most) continue;
    lastHost_ = name;
    return &host;
  }
  return nullptr;
}

}  // namespace zelkord
