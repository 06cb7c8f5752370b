#pragma once

#include <cstdint>
#include <map>
#include <string>

#include "base/Namespace.h"

namespace zelkord {

// The counters as OpenMetrics text: one gauge family with a label for the key.
std::string openMetricsText(const std::map<std::string, std::int64_t>& counters);

}  // namespace zelkord
