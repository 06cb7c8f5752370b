#pragma once

#include <cstddef>
#include <cstdint>
#include <list>
#include <unordered_map>
#include <utility>
#include <vector>

#include "platform/api/URLRequest.h"
#include "platform/linux/url_cache/CacheEntry.h"

namespace zelkord {

// Which responses are kept, in the order of their use, and which have to go.
//
// Threading: none of its own.
class CacheIndex final {
 public:
  static constexpr std::size_t kMaximumCount = 8192;
  static constexpr std::size_t kMaximumVariants = 8;  // of one URL

  using Ids = std::vector<std::int64_t>;
  using Uses = std::vector<std::pair<std::int64_t, std::uint64_t>>;

  explicit CacheIndex(std::uint64_t maximumCost) : maximumCost_(maximumCost) {}

  // Takes what was kept before. Requires an empty index. Gives the ids of what is too much.
  Ids load(std::vector<CacheEntry> entries);

  bool empty() const { return byId_.empty(); }
  std::uint64_t cost() const { return cost_; }
  bool has(std::int64_t id) const { return byId_.contains(id); }
  bool hasURL(const Digest& url) const { return byURL_.contains(url); }

  // The newest entry that fits the request, which counts as a use; null when there is none. Valid
  // until the next change.
  const CacheEntry* find(const Digest& url, const URLRequest& request);
  // Adds an entry with a new id. Gives the ids that it replaces or displaces.
  Ids add(CacheEntry& entry);
  bool remove(std::int64_t id);
  // Gives the ids that were there.
  Ids removeURL(const Digest& url);
  Ids removeScope(std::uint64_t scope);
  void clear();

  // What was used since the last call.
  Uses takeUses();

 private:
  using Order = std::list<CacheEntry>;  // the last used first
  using Place = Order::iterator;

  void _link(Place place);
  void _use(Place place);
  Ids _shrink();

  const std::uint64_t maximumCost_;
  Order order_;
  std::unordered_map<std::int64_t, Place> byId_;
  std::unordered_map<Digest, std::vector<Place>, DigestHash> byURL_;  // the newest last
  std::uint64_t cost_ = 0;
  std::int64_t nextId_ = 1;
  std::uint64_t uses_ = 0;
  std::uint64_t takenUses_ = 0;
};

}  // namespace zelkord
