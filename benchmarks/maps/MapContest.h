#pragma once

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "benchmarks/maps/AllocatedBytes.h"
#include "benchmarks/maps/Maps.h"

namespace zelkord::bench {

// What every map is given.
struct Workload {
  std::vector<std::string> keys;
  std::vector<std::string> lookups;   // of those keys, in an order that no predictor learns
  std::vector<std::string> prefixes;  // of 5 to 50 keys each
  std::vector<ItemPointer> items;     // one for each key
};

// One map with all the keys, and the work that is timed.
template <typename Map>
class Contestant {
 public:
  explicit Contestant(const Workload& workload) : workload_(workload) {
    const auto before = allocatedBytes();
    for (std::size_t i = 0; i < workload.keys.size(); ++i)
      map_.insert(workload.keys[i], workload.items[i]);
    bytes_ = allocatedBytes() - before;
  }

  static const char* name() { return Map::kName; }
  double bytesPerKey() const {
    return static_cast<double>(bytes_) / static_cast<double>(workload_.keys.size());
  }

  // Each tells how many nanoseconds one operation took, and leaves the map as it was.
  double timeFind() {
    return _timed(workload_.lookups.size(), [this] {
      for (const auto& key : workload_.lookups) _digest(map_.find(key));
    });
  }
  double timeWalk() {
    return _timed(workload_.prefixes.size(), [this] {
      for (const auto& prefix : workload_.prefixes)
        map_.walk(prefix, [this](const Item* item) { _digest(item); });
    });
  }
  double timeErase() {
    const double time = _timed(_moving(), [this] { _eraseSome(); });
    _insertSome();
    return time;
  }
  double timeInsert() {
    _eraseSome();
    return _timed(_moving(), [this] { _insertSome(); });
  }

  // Depends on everything that was found and its order.
  std::uint64_t digest() const { return digest_; }

 private:
  std::size_t _moving() const { return std::min<std::size_t>(workload_.keys.size() / 2, 200); }
  void _eraseSome() {
    for (std::size_t i = 0; i < _moving(); ++i) map_.erase(workload_.keys[i]);
  }
  void _insertSome() {
    for (std::size_t i = 0; i < _moving(); ++i) map_.insert(workload_.keys[i], workload_.items[i]);
  }
  void _digest(const Item* item) {
    digest_ = digest_ * 31 + reinterpret_cast<std::uintptr_t>(item);
  }

  template <typename Work>
  static double _timed(std::size_t operations, const Work& work) {
    const auto start = std::chrono::steady_clock::now();
    work();
    const std::chrono::duration<double, std::nano> time = std::chrono::steady_clock::now() - start;
    return time.count() / static_cast<double>(operations);
  }

  const Workload& workload_;
  Map map_;
  std::size_t bytes_ = 0;
  std::uint64_t digest_ = 0;
};

}  // namespace zelkord::bench
