#include "platform/linux/url_cache/MemoryPart.h"

#include <utility>

namespace zelkord {

void MemoryPart::put(std::int64_t id, StoredPointer stored) {
  remove(id);
  const auto cost = costOf(*stored);
  if (cost > maximumCost_ / 4) return;
  order_.push_front({id, std::move(stored), cost});
  byId_.emplace(id, order_.begin());
  cost_ += cost;
  while (cost_ > maximumCost_) remove(order_.back().id);
}

StoredPointer MemoryPart::find(std::int64_t id) {
  const auto found = byId_.find(id);
  if (found == byId_.end()) return nullptr;
  order_.splice(order_.begin(), order_, found->second);
  return found->second->stored;
}

void MemoryPart::remove(std::int64_t id) {
  const auto found = byId_.find(id);
  if (found == byId_.end()) return;
  cost_ -= found->second->cost;
  order_.erase(found->second);
  byId_.erase(found);
}

void MemoryPart::clear() {
  byId_.clear();
  order_.clear();
  cost_ = 0;
}

}  // namespace zelkord
