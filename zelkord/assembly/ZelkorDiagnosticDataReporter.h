#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "platform/api/Counters.h"

namespace zelkord {

// Adds to or sets the daemon's counters, whose keys begin with "com.quenta.zelkord.". Any thread.
class ZelkorDiagnosticDataReporter final {
 public:
  explicit ZelkorDiagnosticDataReporter(Counters& counters) : counters_(counters) {}

  void setValue(std::int64_t value, std::string_view forScalarKey) const {
    counters_.set(forScalarKey, value);
  }
  void addValue(std::int64_t value, std::string_view forScalarKey) const {
    counters_.add(forScalarKey, value);
  }
  void clearScalarKey(std::string_view key) const { counters_.set(key, 0); }

 private:
  Counters& counters_;
};

// "com.quenta.zelkord.PREFIX.SUFFIX"
std::string createAggdKey(std::string_view prefix, std::string_view suffix);

}  // namespace zelkord
