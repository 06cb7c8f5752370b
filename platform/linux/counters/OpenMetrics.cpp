#include "platform/linux/counters/OpenMetrics.h"

namespace zelkord {
namespace {

std::string metricsLabel(const std::string& key) {
  std::string label;
  for (const char c : key) {
    if (c == '\n') {
      label += "\\n";
      continue;
    }
    if (c == '\\' || c == '"') label += '\\';
    label += c;
  }
  return label;
}

}  // namespace

std::string openMetricsText(const std::map<std::string, std::int64_t>& counters) {
  std::string text =
      "# TYPE zelkord_counter gauge\n"
      "# HELP zelkord_counter Counters of zelkord, cumulative over restarts.\n";
  for (const auto& [key, value] : counters) {
    text += "zelkord_counter{key=\"" + metricsLabel(key) + "\"} " + std::to_string(value) + "\n";
  }
  return text + "# EOF\n";
}

}  // namespace zelkord
