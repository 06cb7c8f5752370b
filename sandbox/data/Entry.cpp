#include "sandbox/data/Entry.h"

#include <array>

namespace sandbox {

std::string_view nameOfKind(Kind kind) {
  static constexpr std::array<std::string_view, kKindCount> kNames = {
      "word", "country", "region", "currency", "language", "character"};
  const auto index = static_cast<std::size_t>(kind);
  return index < kNames.size() ? kNames[index] : "unknown";
}

}  // namespace sandbox
