#pragma once

#include <google/protobuf/io/coded_stream.h>

#include <bit>
#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <tuple>
#include <type_traits>
#include <vector>

#include "halvane/Field.h"
#include "halvane/RecordWriter.h"

namespace zelkor {

// Why a message was not taken.
enum class RecordFault : std::uint8_t {
  None,
  Malformed,     // does not parse, or a text is not UTF-8
  UnknownValue,  // an enumeration's value stands in no table
  TooManyItems,  // more than kMaximumItems nested records and list entries
};

// Reads records from protocol-buffers messages (proto3), after their descriptions. Strict where the
// bytes come from outside: lengths, UTF-8, enumerations and the number of nested items are checked;
// unknown fields, and known ones of another wire type, are passed over. As the format has it, the
// last of several values of a field wins, and nested records merge.
//
// A reader reads one message; what it reads into may be half filled when it fails.
// Threading: one thread. Ownership: the bytes outlive the reader, and the views that it fills.
class RecordReader final {
 public:
  // Of a whole message: what reading one, or using what was read, may take.
  static constexpr std::uint32_t kMaximumItems = 65'536;

  // Checked: it was read before, or is our own; its values are taken as they are.
  enum class Message : std::uint8_t { FromOutside, Checked };

  explicit RecordReader(std::string_view message, Message kind = Message::FromOutside)
      : RecordReader(message, nullptr) {
    kind_ = kind;
  }
  RecordReader(const RecordReader&) = delete;
  RecordReader& operator=(const RecordReader&) = delete;

  // The next message after this one, on the same account of items.
  RecordReader(std::string_view message, RecordReader* outer);

  // False when the message is at fault; `fault` then says how.
  template <typename Record, typename... Extra>
  bool read(Record& record, const std::tuple<Extra...>& extra = {});
  RecordFault fault() const { return *fault_; }

 private:
  using Input = google::protobuf::io::CodedInputStream;

  bool _fail(RecordFault fault);
  bool _takeItems(std::size_t count);
  // Passes over a field that nobody asked for.
  bool _skip(std::uint32_t tag);
  bool _readVarint(std::uint64_t& value);
  // The bytes of a length-delimited field, where they lie.
  bool _readBytes(std::string_view& bytes);
  bool _readText(std::string_view& text);

  // One value of the type that the field has.
  template <typename Value>
  bool _readOne(Value& value);
  template <typename Value>
  bool _readInto(Value& value);
  template <typename Value>
  bool _readInto(std::optional<Value>& value);
  template <typename Value>
  bool _readInto(std::vector<Value>& values);
  template <typename Record>
  bool _readInto(Packed<Record>& record);
  template <typename Item>
  bool _readInto(PackedList<Item>& items);
  bool _readInto(std::map<std::string, std::string>& map);

  template <typename Record, typename OneField>
  bool _matches(std::uint32_t tag, const OneField& field, Record& record, bool& good);
  template <typename Record, typename Fields>
  bool _readField(std::uint32_t tag, Record& record, const Fields& fields, bool& good);

  Input input_;
  Message kind_;
  RecordFault ownFault_ = RecordFault::None;
  std::uint32_t ownItems_ = 0;
  // The outermost message's.
  RecordFault* fault_;
  std::uint32_t* items_;
};

namespace wire {

// What a field holds one of, and how that is written.
template <typename Value>
struct Element {
  static constexpr Type kType = Codec<Value>::kType;
};
template <typename Value>
struct Element<std::optional<Value>> : Element<Value> {};
template <typename Value>
struct Element<std::vector<Value>> : Element<Value> {};
template <typename Value>
struct Element<Packed<Value>> : Element<Value> {};
template <typename Value>
struct Element<PackedList<Value>> : Element<Value> {};
template <>
struct Element<StringMap> {
  static constexpr Type kType = Type::Bytes;
};

template <const auto& Table, typename Value>
constexpr bool isTerm(const Term<Table, Value>*) {
  return true;
}
constexpr bool isTerm(const void*) { return false; }

}  // namespace wire

template <typename Value>
bool RecordReader::_readOne(Value& value) {
  if constexpr (wire::isTerm(static_cast<const Value*>(nullptr))) {
    if (!_readOne(value.value)) return false;
    return kind_ == Message::Checked || value.isKnown() || _fail(RecordFault::UnknownValue);
  } else if constexpr (std::is_integral_v<Value>) {
    std::uint64_t varint = 0;
    if (!_readVarint(varint)) return false;
    value = static_cast<Value>(varint);
    if constexpr (std::is_same_v<Value, bool>) value = varint != 0;
    return true;
  } else if constexpr (std::is_same_v<Value, double>) {
    std::uint64_t bits = 0;
    if (!input_.ReadLittleEndian64(&bits)) return _fail(RecordFault::Malformed);
    value = std::bit_cast<double>(bits);
    return true;
  } else if constexpr (std::is_same_v<Value, std::string_view>) {
    return _readBytes(value);
  } else {
    std::string_view bytes;
    if constexpr (std::is_same_v<Value, std::string>) {
      if (!_readText(bytes)) return false;
      value.assign(bytes);
    } else if constexpr (std::is_base_of_v<JsonText, Value>) {
      if (!_readText(bytes)) return false;
      value.text.assign(bytes);
    } else {
      if (!_takeItems(1) || !_readBytes(bytes)) return false;
      return RecordReader(bytes, this).read(value);
    }
    return true;
  }
}

template <typename Value>
bool RecordReader::_readInto(Value& value) {
  return _readOne(value);
}

template <typename Value>
bool RecordReader::_readInto(std::optional<Value>& value) {
  if (!value) value.emplace();
  return _readOne(*value);
}

template <typename Value>
bool RecordReader::_readInto(std::vector<Value>& values) {
  return _readOne(values.emplace_back());
}

// A record that comes again merges with what is there, which is unpacked and packed for that: it
// counts for as many items as take as long.
template <typename Record>
bool RecordReader::_readInto(Packed<Record>& record) {
  constexpr std::size_t kBytesOfAnItem = 64;
  Record merged;
  if (record) {
    if (!_takeItems(record.packed().size() / kBytesOfAnItem)) return false;
    merged = *record;
  }
  if (!_readOne(merged)) return false;
  record = merged;
  return true;
}

template <typename Item>
bool RecordReader::_readInto(PackedList<Item>& items) {
  if constexpr (std::is_same_v<Item, std::string>) {
    if (!_takeItems(1)) return false;
  }
  Item item;
  if (!_readOne(item)) return false;
  items.push_back(item);
  return true;
}

template <typename Record, typename OneField>
bool RecordReader::_matches(std::uint32_t tag, const OneField& field, Record& record, bool& good) {
  using Value = ValueOf<OneField>;
  if (tag != wire::tagOf(field.number, wire::Element<Value>::kType)) return false;
  good = _readInto(record.*field.member);
  return true;
}

template <typename Record, typename Fields>
bool RecordReader::_readField(std::uint32_t tag, Record& record, const Fields& fields, bool& good) {
  return std::apply(
      [&](const auto&... field) { return (_matches(tag, field, record, good) || ...); }, fields);
}

template <typename Record, typename... Extra>
bool RecordReader::read(Record& record, const std::tuple<Extra...>& extra) {
  bool good = true;
  while (const auto tag = input_.ReadTag()) {
    if (!_readField(tag, record, kFieldsOf<Record>, good) &&
        !_readField(tag, record, extra, good)) {
      good = _skip(tag);
    }
    if (!good) return false;
  }
  return input_.ConsumedEntireMessage() || _fail(RecordFault::Malformed);
}

}  // namespace zelkor
