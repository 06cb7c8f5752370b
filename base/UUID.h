#pragma once

#include <array>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "base/Export.h"
#include "base/Namespace.h"

namespace zelkor {

// A 128-bit identifier.
struct ZK_EXPORT UUID {
  std::array<std::uint8_t, 16> bytes{};

  // Version 4, variant 1 (RFC 4122) from 16 random bytes.
  static UUID fromRandomBytes(std::array<std::uint8_t, 16> random);

  // The identifier of a text of that form, in either case. None for any other text.
  static std::optional<UUID> fromString(std::string_view text);

  // Upper case, "XXXXXXXX-XXXX-XXXX-XXXX-XXXXXXXXXXXX".
  std::string string() const;

  friend bool operator==(const UUID&, const UUID&) = default;
};

}  // namespace zelkor
