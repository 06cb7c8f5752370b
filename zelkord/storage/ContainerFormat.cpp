#include "zelkord/storage/ContainerFormat.h"

namespace zelkord {

std::size_t countRecords(std::string_view bytes) {
  std::size_t count = 0;
  while (bytes.size() > kLengthSize) {
    const auto length = framedLengthAt(bytes, 0);
    if (length == 0 || length > bytes.size() - kLengthSize) break;
    bytes.remove_prefix(kLengthSize + length);
    ++count;
  }
  return count;
}

std::optional<std::uint64_t> endOfWholeRecords(std::string_view bytes, std::uint64_t limit) {
  std::uint64_t position = 0;
  while (position < bytes.size()) {
    const auto rest = bytes.size() - position;
    if (rest < kLengthSize) return position;
    const auto length = framedLengthAt(bytes, position);
    if (length == 0 || length >= limit) return std::nullopt;
    if (length > rest - kLengthSize) return position;
    position += kLengthSize + length;
  }
  return std::nullopt;
}

}  // namespace zelkord
