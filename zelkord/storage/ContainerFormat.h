#pragma once

#include <bit>
#include <cstdint>
#include <cstring>
#include <optional>
#include <string>
#include <string_view>

#include "base/Namespace.h"

namespace zelkord {

// A container is records one after the other, each a length of eight bytes, least significant
// first, and as many bytes of payload: the version, the session's header, then its feedback.
inline constexpr std::uint64_t kLengthSize = 8;
static_assert(std::endian::native == std::endian::little);

inline void appendFramed(std::string_view payload, std::string& bytes) {
  const std::uint64_t length = payload.size();
  bytes.append(reinterpret_cast<const char*>(&length), kLengthSize);
  bytes.append(payload);
}

// Requires kLengthSize bytes at `position`.
inline std::uint64_t framedLengthAt(std::string_view bytes, std::uint64_t position) {
  std::uint64_t length = 0;
  std::memcpy(&length, bytes.data() + position, kLengthSize);
  return length;
}

// How many whole records there are, whatever they hold.
std::size_t countRecords(std::string_view bytes);

// Where the last whole record of a container ends that a writer left in the middle of the next one.
// None when there is nothing to cut: the container ends with a record, or it is damaged otherwise,
// which a length of zero or of `limit` and more shows.
std::optional<std::uint64_t> endOfWholeRecords(std::string_view bytes, std::uint64_t limit);

}  // namespace zelkord
