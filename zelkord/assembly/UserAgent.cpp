#include "zelkord/assembly/UserAgent.h"

#include <fmt/core.h>

#include "corezelkor/Constants.h"

namespace zelkord {

std::optional<std::string> createUserAgentString(std::string_view seed,
                                                 const DeviceProperties& device) {
  if (seed.empty()) return std::nullopt;
  if (seed.find("Zelkord/1.0 (") != std::string_view::npos) return std::string(seed);
  return fmt::format("{} ({}; {} {}) {}", kZLKZelkordNameVersion, device.productType(),
                     device.productName(), device.buildVersion(), seed);
}

std::optional<std::string> zelkordUserAgent(const DeviceProperties& device) {
  return createUserAgentString(kZLKZelkordNameVersion, device);
}

}  // namespace zelkord
