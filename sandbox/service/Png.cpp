#include "sandbox/service/Png.h"

#include <zlib.h>

#include <algorithm>
#include <string_view>
#include <vector>

namespace sandbox {

namespace {

std::string bigEndian(std::uint32_t number) {
  const auto byte = [number](int shift) { return static_cast<char>(number >> shift); };
  return {byte(24), byte(16), byte(8), byte(0)};
}

// Length, type, data, CRC-32 of type and data.
std::string pngChunk(std::string_view type, std::string_view data) {
  const std::string checked = std::string(type).append(data);
  const uLong crc =
      crc32(0, reinterpret_cast<const Bytef*>(checked.data()), static_cast<uInt>(checked.size()));
  return bigEndian(static_cast<std::uint32_t>(data.size())) + checked +
         bigEndian(static_cast<std::uint32_t>(crc));
}

std::uint32_t lighter(std::uint32_t colour) { return colour | 0x606060; }

// Each row: filter type 0, then three bytes a pixel.
std::string pngRows(std::uint32_t colour, unsigned size) {
  std::string rows;
  const long radius = size / 3;
  for (unsigned y = 0; y < size; ++y) {
    rows.push_back('\0');
    for (unsigned x = 0; x < size; ++x) {
      const long dx = static_cast<long>(x) - static_cast<long>(size / 2);
      const long dy = static_cast<long>(y) - static_cast<long>(size / 2);
      const std::uint32_t pixel = dx * dx + dy * dy < radius * radius ? lighter(colour) : colour;
      rows.append(bigEndian(pixel), 1, 3);
    }
  }
  return rows;
}

std::string zlibPacked(const std::string& text) {
  uLongf size = compressBound(static_cast<uLong>(text.size()));
  std::string packed(size, '\0');
  compress(reinterpret_cast<Bytef*>(packed.data()), &size,
           reinterpret_cast<const Bytef*>(text.data()), static_cast<uLong>(text.size()));
  packed.resize(size);
  return packed;
}

}  // namespace

std::string pngOfColour(std::uint32_t colour, unsigned size) {
  std::string header = bigEndian(size) + bigEndian(size);
  header.append({8, 2, 0, 0, 0});  // 8 bits, RGB, the usual compression, filters, no interlacing
  return "\x89PNG\r\n\x1A\n" + pngChunk("IHDR", header) +
         pngChunk("IDAT", zlibPacked(pngRows(colour, size))) + pngChunk("IEND", "");
}

}  // namespace sandbox
