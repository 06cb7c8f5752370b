#include "base/UUID.h"

#include <string_view>

namespace zelkor {

UUID UUID::fromRandomBytes(std::array<std::uint8_t, 16> random) {
  random[6] = static_cast<std::uint8_t>((random[6] & 0x0F) | 0x40);
  random[8] = static_cast<std::uint8_t>((random[8] & 0x3F) | 0x80);
  return {random};
}

namespace {

constexpr bool isDash(std::size_t position) {
  return position == 8 || position == 13 || position == 18 || position == 23;
}

int digitOf(char character) {
  if (character >= '0' && character <= '9') return character - '0';
  if (character >= 'A' && character <= 'F') return character - 'A' + 10;
  if (character >= 'a' && character <= 'f') return character - 'a' + 10;
  return -1;
}

}  // namespace

std::optional<UUID> UUID::fromString(std::string_view text) {
  constexpr std::size_t kLength = 36;
  if (text.size() != kLength) return std::nullopt;
  UUID uuid;
  std::size_t digits = 0;
  for (std::size_t i = 0; i < kLength; ++i) {
    if (isDash(i)) {
      if (text[i] != '-') return std::nullopt;
      continue;
    }
    const int digit = digitOf(text[i]);
    if (digit < 0) return std::nullopt;
    auto& byte = uuid.bytes[digits++ / 2];
    byte = static_cast<std::uint8_t>(byte << 4 | digit);
  }
  return uuid;
}

std::string UUID::string() const {
  constexpr std::string_view kDigits = "0123456789ABCDEF";
  std::string text;
  text.reserve(36);
  for (std::size_t i = 0; i < bytes.size(); ++i) {
    if (i == 4 || i == 6 || i == 8 || i == 10) text += '-';
    text += kDigits[bytes[i] >> 4];
    text += kDigits[bytes[i] & 0x0F];
  }
  return text;
}

}  // namespace zelkor
