#include "platform/linux/url_cache/CacheIndex.h"

#include <algorithm>

#include "platform/linux/url_cache/CacheVary.h"

namespace zelkord {

CacheIndex::Ids CacheIndex::load(std::vector<CacheEntry> entries) {
  std::ranges::sort(entries, std::greater(), &CacheEntry::used);
  for (auto& entry : entries) order_.push_back(std::move(entry));
  std::vector<Place> places;
  for (auto place = order_.begin(); place != order_.end(); ++place) places.push_back(place);
  std::ranges::sort(places, std::less(), [](Place place) { return place->id; });
  for (const Place place : places) _link(place);
  if (!order_.empty()) uses_ = takenUses_ = order_.front().used;
  return _shrink();
}

void CacheIndex::_link(Place place) {
  byId_.emplace(place->id, place);
  byURL_[place->url].push_back(place);
  cost_ += place->cost;
  nextId_ = std::max(nextId_, place->id + 1);
}

void CacheIndex::_use(Place place) {
  place->used = ++uses_;
  order_.splice(order_.begin(), order_, place);
}

const CacheEntry* CacheIndex::find(const Digest& url, const URLRequest& request) {
  const auto found = byURL_.find(url);
  if (found == byURL_.end()) return nullptr;
  const auto& variants = found->second;
  const auto fits = std::find_if(variants.rbegin(), variants.rend(), [&](Place place) {
    return variantOf(place->vary, request) == place->variant;
  });
  if (fits == variants.rend()) return nullptr;
  _use(*fits);
  return &**fits;
}

CacheIndex::Ids CacheIndex::add(CacheEntry& entry) {
  Ids gone;
  if (const auto found = byURL_.find(entry.url); found != byURL_.end()) {
    for (const Place place : found->second) {
      if (place->vary == entry.vary && place->variant == entry.variant) gone.push_back(place->id);
    }
    if (gone.empty() && found->second.size() >= kMaximumVariants) {
      gone.push_back(found->second.front()->id);
    }
  }
  for (const auto id : gone) remove(id);
  entry.id = nextId_;
  entry.used = ++uses_;
  order_.push_front(entry);
  _link(order_.begin());
  const auto displaced = _shrink();
  gone.insert(gone.end(), displaced.begin(), displaced.end());
  return gone;
}

bool CacheIndex::remove(std::int64_t id) {
  const auto found = byId_.find(id);
  if (found == byId_.end()) return false;
  const Place place = found->second;
  const auto variants = byURL_.find(place->url);
  std::erase(variants->second, place);
  if (variants->second.empty()) byURL_.erase(variants);
  cost_ -= place->cost;
  byId_.erase(found);
  order_.erase(place);
  return true;
}

CacheIndex::Ids CacheIndex::removeURL(const Digest& url) {
  Ids gone;
  const auto found = byURL_.find(url);
  if (found == byURL_.end()) return gone;
  for (const Place place : found->second) gone.push_back(place->id);
  for (const auto id : gone) remove(id);
  return gone;
}

CacheIndex::Ids CacheIndex::removeScope(std::uint64_t scope) {
  Ids gone;
  for (const auto& entry : order_) {
    if (entry.scope == scope) gone.push_back(entry.id);
  }
  for (const auto id : gone) remove(id);
  return gone;
}

void CacheIndex::clear() {
  byURL_.clear();
  byId_.clear();
  order_.clear();
  cost_ = 0;
}

CacheIndex::Ids CacheIndex::_shrink() {
  Ids gone;
  while (order_.size() > 1 && (cost_ > maximumCost_ || order_.size() > kMaximumCount)) {
    gone.push_back(order_.back().id);
    remove(gone.back());
  }
  return gone;
}

CacheIndex::Uses CacheIndex::takeUses() {
  Uses uses;
  for (const auto& entry : order_) {
    if (entry.used <= takenUses_) break;
    uses.emplace_back(entry.id, entry.used);
  }
  takenUses_ = uses_;
  return uses;
}

}  // namespace zelkord
