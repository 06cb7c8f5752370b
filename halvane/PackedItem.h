#pragma once

#include <string>
#include <string_view>
#include <type_traits>

#include "halvane/RecordReader.h"
#include "halvane/RecordWriter.h"

namespace zelkor {

// How Packed and PackedList keep what they hold: as in a message, after its length.

template <typename Item>
void packItem(const Item& item, std::string& bytes) {
  const auto old = bytes.size();
  bytes.resize(old + wire::Codec<Item>::size(item));
  wire::Codec<Item>::write(item, reinterpret_cast<std::uint8_t*>(bytes.data() + old));
}

// The first item's message; `bytes` begin with its length.
inline std::string_view firstPacked(std::string_view bytes) {
  std::size_t length = 0;
  std::size_t used = 0;
  for (unsigned shift = 0;; shift += 7) {
    const auto byte = static_cast<unsigned char>(bytes[used++]);
    length |= static_cast<std::size_t>(byte & 0x7F) << shift;
    if (byte < 0x80) break;
  }
  return bytes.substr(used, length);
}

template <typename Item>
Item unpackItem(std::string_view message) {
  if constexpr (std::is_same_v<Item, std::string>) {
    return std::string(message);
  } else {
    Item item;
    RecordReader(message, RecordReader::Message::Checked).read(item);
    return item;
  }
}

}  // namespace zelkor
