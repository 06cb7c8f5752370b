#pragma once

#include <cstdint>
#include <list>
#include <unordered_map>

#include "platform/linux/url_cache/StoredResponse.h"

namespace zelkord {

// The responses that are held in memory: those used last, as many as fit. One that takes more than
// a quarter of the whole is not held.
//
// Threading: none of its own.
class MemoryPart final {
 public:
  explicit MemoryPart(std::uint64_t maximumCost) : maximumCost_(maximumCost) {}

  void put(std::int64_t id, StoredPointer stored);
  // Null when it is not held; else a use.
  StoredPointer find(std::int64_t id);
  bool has(std::int64_t id) const { return byId_.contains(id); }
  void remove(std::int64_t id);
  void clear();
  std::uint64_t cost() const { return cost_; }

 private:
  struct Held {
    std::int64_t id;
    StoredPointer stored;
    std::uint64_t cost;
  };
  using Order = std::list<Held>;  // the last used first

  const std::uint64_t maximumCost_;
  Order order_;
  std::unordered_map<std::int64_t, Order::iterator> byId_;
  std::uint64_t cost_ = 0;
};

}  // namespace zelkord
