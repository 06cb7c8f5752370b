#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <string>
#include <string_view>

#include "base/Namespace.h"

namespace zelkord {

// Counters by key, of which there are never more than memory, disk and their readers can bear:
// parts of keys come from clients. What has no place counts under one key for all.
//
// Threading: a value.
class BoundedCounters final {
 public:
  static constexpr std::size_t kMaximumKeySize = 256;  // bytes
  static constexpr std::size_t kMaximumKeys = 4096;    // with the one for all others
  // Of these, places that keys with parts from clients leave to those of the daemon's own words.
  static constexpr std::size_t kKeptForOwnWords = 256;
  static constexpr std::string_view kOthers = "com.quenta.zelkord.other";

  using Values = std::map<std::string, std::int64_t, std::less<>>;

  // A sum that would not fit stays at the largest value.
  void add(std::string_view key, std::int64_t amount);
  // Of a key without a place the value is added to the others'.
  void set(std::string_view key, std::int64_t value);
  const Values& values() const { return values_; }

 private:
  // Whose number changes for `key`: its own, or the others'.
  std::int64_t& _place(std::string_view key);
  bool _hasRoomFor(std::string_view key) const;

  Values values_;
  std::size_t ofClients_ = 0;  // of the values: those whose key may have a part from a client
};

}  // namespace zelkord
