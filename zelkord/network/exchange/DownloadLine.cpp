#include "zelkord/network/exchange/DownloadLine.h"

#include <algorithm>

namespace zelkord {

void DownloadLine::add(const std::string& host, Id id) {
  const auto place = hosts_.try_emplace(host).first;
  auto& wanted = place->second.wanted;
  wanted.push_back({id, place});
  places_.emplace(id, std::prev(wanted.end()));
}

void DownloadLine::ended(const std::string& host, Connections connections) {
  const auto found = hosts_.find(host);
  if (found == hosts_.end() || found->second.underWay == 0) return;
  auto& place = found->second;
  --underWay_;
  --place.underWay;
  if (connections == Connections::Shared) place.most = kMostOnSharedConnection;
  _forgetIfIdle(found);
}

std::vector<DownloadLine::Id> DownloadLine::abandon(Id id) {
  const auto found = places_.find(id);
  if (found == places_.end() || found->second->isAbandoned) return {};
  const auto place = found->second;
  auto& host = place->host->second;
  place->isAbandoned = true;
  ++host.abandoned;
  abandoned_.splice(abandoned_.end(), host.wanted, place);
  std::vector<Id> dropped;
  if (host.abandoned > kMostAbandonedOfOneHost) {
    const auto oldest = std::ranges::find(abandoned_, place->host, &Waiting::host);
    dropped.push_back(_remove(abandoned_, oldest));
  } else if (abandoned_.size() > kMostAbandoned) {
    dropped.push_back(_remove(abandoned_, abandoned_.begin()));
  }
  return dropped;
}

std::vector<DownloadLine::Id> DownloadLine::dropAbandoned(const std::string& host) {
  std::vector<Id> dropped;
  for (auto place = abandoned_.begin(); place != abandoned_.end();) {
    const auto next = std::next(place);
    if (place->host->first == host) dropped.push_back(_remove(abandoned_, place));
    place = next;
  }
  return dropped;
}

void DownloadLine::want(Id id) {
  const auto found = places_.find(id);
  if (found == places_.end() || !found->second->isAbandoned) return;
  const auto place = found->second;
  auto& host = place->host->second;
  place->isAbandoned = false;
  --host.abandoned;
  host.wanted.splice(host.wanted.end(), abandoned_, place);
}

std::vector<DownloadLine::Id> DownloadLine::takeDue() {
  std::vector<Id> due;
  for (auto host = _nextHost(); host != hosts_.end(); host = _nextHost()) {
    due.push_back(_begin(host->second.wanted, host->second.wanted.begin()));
  }
  for (auto place = _nextAbandoned(); place != abandoned_.end(); place = _nextAbandoned()) {
    due.push_back(_begin(abandoned_, place));
  }
  return due;
}

bool DownloadLine::_mayBegin(const Host& host) const {
  if (underWay_ < kMostUnderWay) return host.underWay < host.most;
  return underWay_ < kMostWithOwnPlaces && host.underWay < kOwnPlacesOfAHost;
}

// A host that is passed over has something under way or something abandoned, so there are few.
DownloadLine::Hosts::iterator DownloadLine::_nextHost() {
  if (underWay_ >= kMostWithOwnPlaces) return hosts_.end();
  auto place = hosts_.upper_bound(lastHost_);
  for (std::size_t passed = 0; passed < hosts_.size(); ++passed, ++place) {
    if (place == hosts_.end()) place = hosts_.begin();
    const auto& [name, host] = *place;
    if (host.wanted.empty() || !_mayBegin(host)) continue;
    lastHost_ = name;
    return place;
  }
  return hosts_.end();
}

DownloadLine::Line::iterator DownloadLine::_nextAbandoned() {
  if (underWay_ >= kMostUnderWay) return abandoned_.end();
  return std::ranges::find_if(
      abandoned_, [this](const auto& waiting) { return _mayBegin(waiting.host->second); });
}

DownloadLine::Id DownloadLine::_begin(Line& line, Line::iterator place) {
  ++underWay_;
  ++place->host->second.underWay;
  return _remove(line, place);
}

DownloadLine::Id DownloadLine::_remove(Line& line, Line::iterator place) {
  const auto [id, host, isAbandoned] = *place;
  if (isAbandoned) --host->second.abandoned;
  places_.erase(id);
  line.erase(place);
  _forgetIfIdle(host);
  return id;
}

void DownloadLine::_forgetIfIdle(Hosts::iterator host) {
  const auto& place = host->second;
  if (place.underWay == 0 && place.wanted.empty() && place.abandoned == 0) hosts_.erase(host);
}

}  // namespace zelkord
