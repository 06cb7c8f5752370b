#pragma once

#include <absl/container/btree_map.h>

#include <algorithm>
#include <boost/smart_ptr/intrusive_ptr.hpp>
#include <boost/smart_ptr/intrusive_ref_counter.hpp>
#include <functional>
#include <map>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "zelkord/resources/CritbitTree.h"

namespace zelkord::bench {

// What is stored under every key.
struct Item : boost::intrusive_ref_counter<Item> {};
using ItemPointer = boost::intrusive_ptr<Item>;

// The same five operations for each kind of map. `walk` calls back with every item whose key begins
// with the prefix, in order.

class TreeMap {
 public:
  static constexpr const char* kName = "crit-bit tree";

  void insert(const std::string& key, const ItemPointer& item) { tree_.setObject(item, key); }
  Item* find(const std::string& key) const { return tree_.objectForKey(key); }
  void erase(const std::string& key) { tree_.removeObjectForKey(key); }
  template <typename Visit>
  void walk(const std::string& prefix, const Visit& visit) const {
    tree_.keysMatchingPrefix(prefix, [&](auto, Item& item, bool&) { visit(&item); });
  }

 private:
  CritbitTree<Item> tree_;
};

// std::map and absl::btree_map.
template <typename Map>
class OrderedMap {
 public:
  static constexpr const char* kName = "an ordered map";

  void insert(const std::string& key, const ItemPointer& item) { map_.insert_or_assign(key, item); }
  Item* find(const std::string& key) const {
    const auto found = map_.find(key);
    return found == map_.end() ? nullptr : found->second.get();
  }
  void erase(const std::string& key) { map_.erase(key); }
  template <typename Visit>
  void walk(const std::string& prefix, const Visit& visit) const {
    for (auto at = map_.lower_bound(prefix); at != map_.end() && at->first.starts_with(prefix);
         ++at)
      visit(at->second.get());
  }

 private:
  Map map_;
};

struct StdMap : OrderedMap<std::map<std::string, ItemPointer>> {
  static constexpr const char* kName = "std::map";
};
struct BtreeMap : OrderedMap<absl::btree_map<std::string, ItemPointer>> {
  static constexpr const char* kName = "absl::btree_map";
};

// A std::vector that is kept in order.
class SortedVector {
 public:
  static constexpr const char* kName = "sorted vector";

  void insert(const std::string& key, const ItemPointer& item) {
    const auto at = _lowerBound(key);
    if (at != entries_.end() && at->first == key) {
      entries_[static_cast<std::size_t>(at - entries_.begin())].second = item;
    } else {
      entries_.emplace(at, key, item);
    }
  }
  Item* find(const std::string& key) const {
    const auto at = _lowerBound(key);
    return at != entries_.end() && at->first == key ? at->second.get() : nullptr;
  }
  void erase(const std::string& key) {
    const auto at = _lowerBound(key);
    if (at != entries_.end() && at->first == key) entries_.erase(at);
  }
  template <typename Visit>
  void walk(const std::string& prefix, const Visit& visit) const {
    for (auto at = _lowerBound(prefix); at != entries_.end() && at->first.starts_with(prefix); ++at)
      visit(at->second.get());
  }

 private:
  using Entries = std::vector<std::pair<std::string, ItemPointer>>;

  Entries::const_iterator _lowerBound(std::string_view key) const {
    return std::lower_bound(
        entries_.begin(), entries_.end(), key,
        [](const auto& entry, std::string_view wanted) { return entry.first < wanted; });
  }

  Entries entries_;
};

}  // namespace zelkord::bench
