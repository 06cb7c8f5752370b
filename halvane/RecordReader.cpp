#include "halvane/RecordReader.h"

#include <google/protobuf/wire_format_lite.h>

#include <limits>

#include "base/Text.h"

namespace zelkor {
namespace {

// A message's key and value.
struct MapEntry {
  std::string key;
  std::string value;

  static constexpr auto fields() {
    return std::tuple{stored(1, "key", &MapEntry::key), stored(2, "value", &MapEntry::value)};
  }
};

const std::uint8_t* bytesOf(std::string_view message) {
  return reinterpret_cast<const std::uint8_t*>(message.data());
}

// What is longer than the library can address counts as an empty message that did not end.
int lengthOf(std::string_view message) {
  return static_cast<int>(std::min<std::size_t>(message.size(), std::numeric_limits<int>::max()));
}

}  // namespace

RecordReader::RecordReader(std::string_view message, RecordReader* outer)
    : input_(bytesOf(message), lengthOf(message)),
      kind_(outer ? outer->kind_ : Message::FromOutside),
      fault_(outer ? outer->fault_ : &ownFault_),
      items_(outer ? outer->items_ : &ownItems_) {
  input_.SetTotalBytesLimit(std::numeric_limits<int>::max());
}

bool RecordReader::_fail(RecordFault fault) {
  *fault_ = fault;
  return false;
}

bool RecordReader::_takeItems(std::size_t count) {
  if (count > kMaximumItems - *items_) return _fail(RecordFault::TooManyItems);
  *items_ += static_cast<std::uint32_t>(count);
  return true;
}

bool RecordReader::_skip(std::uint32_t tag) {
  using google::protobuf::internal::WireFormatLite;
  if (WireFormatLite::GetTagFieldNumber(tag) == 0) return _fail(RecordFault::Malformed);
  return WireFormatLite::SkipField(&input_, tag) || _fail(RecordFault::Malformed);
}

bool RecordReader::_readVarint(std::uint64_t& value) {
  return input_.ReadVarint64(&value) || _fail(RecordFault::Malformed);
}

bool RecordReader::_readBytes(std::string_view& bytes) {
  std::uint64_t length = 0;
  if (!_readVarint(length)) return false;
  const void* start = nullptr;
  int available = 0;
  input_.GetDirectBufferPointerInline(&start, &available);
  if (length > static_cast<std::uint64_t>(available)) return _fail(RecordFault::Malformed);
  bytes = {static_cast<const char*>(start), static_cast<std::size_t>(length)};
  return input_.Skip(static_cast<int>(length)) || _fail(RecordFault::Malformed);
}

bool RecordReader::_readText(std::string_view& text) {
  if (!_readBytes(text)) return false;
  return kind_ == Message::Checked || isValidUtf8(text) || _fail(RecordFault::Malformed);
}

bool RecordReader::_readInto(std::map<std::string, std::string>& map) {
  MapEntry entry;
  if (!_readOne(entry)) return false;
  map.insert_or_assign(std::move(entry.key), std::move(entry.value));
  return true;
}

}  // namespace zelkor
