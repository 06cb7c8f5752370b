#include "zelkord/assembly/ClientShortName.h"

#include <array>

#include "base/Text.h"

namespace zelkord {

std::optional<std::string> clientShortName(std::string_view identifier) {
  constexpr std::array<std::string_view, 7> kNames = {"brelin",   "lanthe", "vocari", "lookup",
                                                      "messages", "news",   "zelkord"};
  const auto lower = lowercased(identifier);
  for (const auto name : kNames) {
    if (lower.find(name) != std::string::npos) return std::string(name);
  }
  return std::nullopt;
}

}  // namespace zelkord
