#pragma once

#include "base/UUID.h"
#include "platform/api/RandomSource.h"

namespace zelkord {

// A new identifier of 122 random bits.
inline UUID randomUUID(RandomSource& random) {
  std::array<std::uint8_t, 16> bytes{};
  random.fill(bytes.data(), bytes.size());
  return UUID::fromRandomBytes(bytes);
}

}  // namespace zelkord
