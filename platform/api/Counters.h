#pragma once

#include <cstdint>
#include <map>
#include <string>
#include <string_view>

#include "base/Namespace.h"

namespace zelkord {

// The aggregate-metrics service: 64-bit counters by key, cumulative over restarts.
// Threading: any thread; changing one is memory only.
class Counters {
 public:
  virtual ~Counters() = default;
  virtual void add(std::string_view key, std::int64_t amount) = 0;
  virtual void set(std::string_view key, std::int64_t value) = 0;
  virtual std::map<std::string, std::int64_t> all() const = 0;
};

}  // namespace zelkord
