#pragma once

#include <google/protobuf/io/coded_stream.h>

#include <bit>
#include <cstdint>
#include <cstring>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <tuple>
#include <type_traits>
#include <vector>

#include "halvane/Field.h"
#include "halvane/JsonText.h"
#include "halvane/Vocabulary.h"

namespace zelkor {

template <typename Item>
class PackedList;
template <typename Record>
class Packed;

// Writes records as protocol-buffers messages (proto3), after their descriptions: what is zero,
// empty or not set is left out, a set optional is written whatever it holds. Written is exactly
// what `recordSize` says, so that a message's length can go before it.
//
// Threading: any thread. Errors: none.

template <typename Record, typename... Extra>
std::size_t recordSize(const Record& record, const std::tuple<Extra...>& extra = {});
template <typename Record, typename... Extra>
std::uint8_t* writeRecord(const Record& record, const std::tuple<Extra...>& extra,
                          std::uint8_t* out);

// Appends the record's message; `extra` are fields that the description does not name.
template <typename Record, typename... Extra>
void appendRecord(const Record& record, const std::tuple<Extra...>& extra, std::string& bytes) {
  const auto old = bytes.size();
  bytes.resize(old + recordSize(record, extra));
  writeRecord(record, extra, reinterpret_cast<std::uint8_t*>(bytes.data() + old));
}
template <typename Record>
void appendRecord(const Record& record, std::string& bytes) {
  appendRecord(record, std::tuple<>(), bytes);
}

namespace wire {

using Coded = google::protobuf::io::CodedOutputStream;

enum class Type : std::uint32_t { Varint = 0, Fixed64 = 1, Bytes = 2 };

constexpr std::uint32_t tagOf(std::uint32_t number, Type type) {
  return number << 3 | static_cast<std::uint32_t>(type);
}

inline std::size_t lengthSize(std::size_t length) { return Coded::VarintSize64(length); }

// Negative numbers take ten bytes, whatever their type.
template <typename Number>
constexpr std::uint64_t asVarint(Number number) {
  if constexpr (std::is_signed_v<Number>) {
    return static_cast<std::uint64_t>(static_cast<std::int64_t>(number));
  } else {
    return number;
  }
}

// A single value, written whatever it is.

template <typename Value>
struct Codec;  // of a nested record

template <typename Value>
requires std::is_integral_v<Value>
struct Codec<Value> {
  static constexpr Type kType = Type::Varint;
  static bool isDefault(Value value) { return value == 0; }
  static std::size_t size(Value value) { return Coded::VarintSize64(asVarint(value)); }
  static std::uint8_t* write(Value value, std::uint8_t* out) {
    return Coded::WriteVarint64ToArray(asVarint(value), out);
  }
};

template <const auto& Table, typename Value>
struct Codec<Term<Table, Value>> {
  static constexpr Type kType = Type::Varint;
  static bool isDefault(Term<Table, Value> term) { return term.value == 0; }
  static std::size_t size(Term<Table, Value> term) { return Codec<Value>::size(term.value); }
  static std::uint8_t* write(Term<Table, Value> term, std::uint8_t* out) {
    return Codec<Value>::write(term.value, out);
  }
};

template <>
struct Codec<double> {
  static constexpr Type kType = Type::Fixed64;
  static bool isDefault(double value) { return std::bit_cast<std::uint64_t>(value) == 0; }
  static std::size_t size(double) { return sizeof(double); }
  static std::uint8_t* write(double value, std::uint8_t* out) {
    return Coded::WriteLittleEndian64ToArray(std::bit_cast<std::uint64_t>(value), out);
  }
};

template <>
struct Codec<std::string_view> {
  static constexpr Type kType = Type::Bytes;
  static bool isDefault(std::string_view text) { return text.empty(); }
  static std::size_t size(std::string_view text) { return lengthSize(text.size()) + text.size(); }
  static std::uint8_t* write(std::string_view text, std::uint8_t* out) {
    out = Coded::WriteVarint64ToArray(text.size(), out);
    if (!text.empty()) std::memcpy(out, text.data(), text.size());
    return out + text.size();
  }
};
template <>
struct Codec<std::string> : Codec<std::string_view> {};

template <>
struct Codec<JsonText> {
  static constexpr Type kType = Type::Bytes;
  static std::size_t size(const JsonText& json) { return Codec<std::string_view>::size(json.text); }
  static std::uint8_t* write(const JsonText& json, std::uint8_t* out) {
    return Codec<std::string_view>::write(json.text, out);
  }
};
template <>
struct Codec<JsonObjectText> : Codec<JsonText> {};

template <typename Record>
requires requires { Record::fields(); }
struct Codec<Record> {
  static constexpr Type kType = Type::Bytes;
  static std::size_t size(const Record& record) {
    const auto length = recordSize(record);
    return lengthSize(length) + length;
  }
  static std::uint8_t* write(const Record& record, std::uint8_t* out) {
    out = Coded::WriteVarint64ToArray(recordSize(record), out);
    return writeRecord(record, std::tuple<>(), out);
  }
};

template <typename Value>
std::size_t taggedSize(std::uint32_t number, const Value& value) {
  return Coded::VarintSize32(tagOf(number, Codec<Value>::kType)) + Codec<Value>::size(value);
}
template <typename Value>
std::uint8_t* writeTagged(std::uint32_t number, const Value& value, std::uint8_t* out) {
  out = Coded::WriteVarint32ToArray(tagOf(number, Codec<Value>::kType), out);
  return Codec<Value>::write(value, out);
}

// A field: none, one or many values.

template <typename Value>
std::size_t fieldSize(std::uint32_t number, const Value& value) {
  return Codec<Value>::isDefault(value) ? 0 : taggedSize(number, value);
}
template <typename Value>
std::uint8_t* writeField(std::uint32_t number, const Value& value, std::uint8_t* out) {
  return Codec<Value>::isDefault(value) ? out : writeTagged(number, value, out);
}

template <typename Value>
std::size_t fieldSize(std::uint32_t number, const std::optional<Value>& value) {
  return value ? taggedSize(number, *value) : 0;
}
template <typename Value>
std::uint8_t* writeField(std::uint32_t number, const std::optional<Value>& value,
                         std::uint8_t* out) {
  return value ? writeTagged(number, *value, out) : out;
}

template <typename Value>
std::size_t fieldSize(std::uint32_t number, const std::vector<Value>& values) {
  std::size_t size = 0;
  for (const auto& value : values) size += taggedSize(number, value);
  return size;
}
template <typename Value>
std::uint8_t* writeField(std::uint32_t number, const std::vector<Value>& values,
                         std::uint8_t* out) {
  for (const auto& value : values) out = writeTagged(number, value, out);
  return out;
}

// What is packed is as it will be written.
inline std::size_t packedFieldSize(std::uint32_t number, std::size_t items, std::size_t bytes) {
  return items * Coded::VarintSize32(tagOf(number, Type::Bytes)) + bytes;
}
inline std::uint8_t* writePackedItem(std::uint32_t number, std::string_view item,
                                     std::uint8_t* out) {
  out = Coded::WriteVarint32ToArray(tagOf(number, Type::Bytes), out);
  return Codec<std::string_view>::write(item, out);
}

template <typename Record>
std::size_t fieldSize(std::uint32_t number, const Packed<Record>& record) {
  return record ? packedFieldSize(number, 1, Codec<std::string_view>::size(record.packed())) : 0;
}
template <typename Record>
std::uint8_t* writeField(std::uint32_t number, const Packed<Record>& record, std::uint8_t* out) {
  return record ? writePackedItem(number, record.packed(), out) : out;
}

template <typename Item>
std::size_t fieldSize(std::uint32_t number, const PackedList<Item>& items) {
  return packedFieldSize(number, items.size(), items.packedSize());
}
template <typename Item>
std::uint8_t* writeField(std::uint32_t number, const PackedList<Item>& items, std::uint8_t* out) {
  for (auto item = items.begin(); item != items.end(); ++item) {
    out = writePackedItem(number, item.packed(), out);
  }
  return out;
}

// A map's entries are messages of a key (1) and a value (2), both always written.
using StringMap = std::map<std::string, std::string>;
inline std::size_t entrySize(const StringMap::value_type& entry) {
  return taggedSize(1, entry.first) + taggedSize(2, entry.second);
}
inline std::size_t fieldSize(std::uint32_t number, const StringMap& map) {
  std::size_t size = 0;
  for (const auto& entry : map) {
    const auto length = entrySize(entry);
    size += Coded::VarintSize32(tagOf(number, Type::Bytes)) + lengthSize(length) + length;
  }
  return size;
}
inline std::uint8_t* writeField(std::uint32_t number, const StringMap& map, std::uint8_t* out) {
  for (const auto& entry : map) {
    out = Coded::WriteVarint32ToArray(tagOf(number, Type::Bytes), out);
    out = Coded::WriteVarint64ToArray(entrySize(entry), out);
    out = writeTagged(1, entry.first, out);
    out = writeTagged(2, entry.second, out);
  }
  return out;
}

template <typename Record, typename Fields>
std::size_t sizeOfFields(const Record& record, const Fields& fields) {
  return std::apply(
      [&](const auto&... field) {
        return (std::size_t{0} + ... + fieldSize(field.number, record.*field.member));
      },
      fields);
}
template <typename Record, typename Fields>
std::uint8_t* writeFields(const Record& record, const Fields& fields, std::uint8_t* out) {
  std::apply(
      [&](const auto&... field) {
        ((out = writeField(field.number, record.*field.member, out)), ...);
      },
      fields);
  return out;
}

}  // namespace wire

template <typename Record, typename... Extra>
std::size_t recordSize(const Record& record, const std::tuple<Extra...>& extra) {
  return wire::sizeOfFields(record, extra) + wire::sizeOfFields(record, kFieldsOf<Record>);
}

template <typename Record, typename... Extra>
std::uint8_t* writeRecord(const Record& record, const std::tuple<Extra...>& extra,
                          std::uint8_t* out) {
  return wire::writeFields(record, kFieldsOf<Record>, wire::writeFields(record, extra, out));
}

}  // namespace zelkor
