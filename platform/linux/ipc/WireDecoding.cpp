#include "platform/linux/ipc/WireDecoding.h"

#include <fcntl.h>

#include <cstring>
#include <utility>

namespace zelkord::ipc {
namespace {

// What values take in memory beside their contents, as the allocator rounds it.
constexpr std::size_t kAllocationBytes = 24;
constexpr std::size_t kBytesWithinAString = 16;
constexpr std::size_t kEntryBytes =
    sizeof(std::pair<const std::string, Value>) + 32 + kAllocationBytes;

// Reads values off one message. Every operation is false once something failed; `failure` then says
// what.
class WireReader {
 public:
  WireReader(sd_bus_message* message, const Limits& limits) : message_(message), limits_(limits) {}

  // A value of one of the types that `Value` has.
  bool read(std::string_view type, Value& out);
  DecodeFailure failure() const { return failure_; }
  std::size_t bytes() const { return bytes_; }

 private:
  template <char kType, typename Wire, typename T>
  bool _number(Value& out);
  bool _string(std::string& out);
  bool _data(Data& out);
  bool _handle(FileHandle& out);
  bool _variant(Value& out);
  bool _skipVariant(std::string type, Value& out);
  bool _dictionary(Dictionary& out);
  bool _stringMap(StringMap& out);
  bool _stringPairs(StringPairs& out);
  bool _integerMap(IntegerMap& out);
  bool _dataMap(DataMap& out);

  template <typename T>
  bool _value(Value& out, bool (WireReader::*reader)(T&));
  template <typename T>
  bool _list(const char* contents, T& out, bool (WireReader::*reader)(typename T::value_type&));
  // `element` reads one element of an array, or the two parts of an entry or a pair.
  template <typename Element>
  bool _array(const char* contents, Element element);
  template <typename Element>
  bool _entries(const char* array, const char* contents, Element element);

  bool _check(int result);
  bool _overLimit(const char* text);

  sd_bus_message* const message_;
  const Limits& limits_;
  int depth_ = 0;
  std::size_t elements_ = 0;
  std::size_t bytes_ = 0;
  DecodeFailure failure_{DecodeFailure::Kind::Malformed, "malformed message"};
};

// The types of `Value` by signature.
struct WireType {
  std::string_view signature;
  bool (*read)(WireReader&, Value&);
};

bool WireReader::_check(int result) {
  if (result >= 0) return true;
  failure_ = {DecodeFailure::Kind::Malformed,
              std::string("malformed message: ") + std::strerror(-result)};
  return false;
}

bool WireReader::_overLimit(const char* text) {
  failure_ = {DecodeFailure::Kind::OverLimit, text};
  return false;
}

template <char kType, typename Wire, typename T>
bool WireReader::_number(Value& out) {
  Wire wire{};
  if (!_check(sd_bus_message_read_basic(message_, kType, &wire))) return false;
  out.variant = static_cast<T>(wire);
  return true;
}

bool WireReader::_string(std::string& out) {
  const char* text = nullptr;
  if (!_check(sd_bus_message_read_basic(message_, 's', &text))) return false;
  const auto length = std::strlen(text);
  if (length > limits_.stringBytes) return _overLimit("a string is too long");
  out.assign(text, length);
  bytes_ += length < kBytesWithinAString ? 0 : length + kAllocationBytes;
  return true;
}

bool WireReader::_data(Data& out) {
  const void* bytes = nullptr;
  std::size_t size = 0;
  if (!_check(sd_bus_message_read_array(message_, 'y', &bytes, &size))) return false;
  if (size > limits_.byteArrayBytes) return _overLimit("a byte array is too long");
  if (size > 0) out = Data(std::string(static_cast<const char*>(bytes), size));
  bytes_ += size;
  return true;
}

bool WireReader::_handle(FileHandle& out) {
  int borrowed = -1;
  if (!_check(sd_bus_message_read_basic(message_, 'h', &borrowed))) return false;
  const int own = ::fcntl(borrowed, F_DUPFD_CLOEXEC, 3);
  if (own < 0) return _overLimit("no file descriptor left");
  out = FileHandle(own);
  return true;
}

template <typename Element>
bool WireReader::_array(const char* contents, Element element) {
  if (!_check(sd_bus_message_enter_container(message_, 'a', contents))) return false;
  for (;;) {
    const int end = sd_bus_message_at_end(message_, 0);
    if (!_check(end)) return false;
    if (end > 0) break;
    if (++elements_ > kMaximumDecodedElements) return _overLimit("too many elements");
    if (!element()) return false;
  }
  return _check(sd_bus_message_exit_container(message_));
}

template <typename Element>
bool WireReader::_entries(const char* array, const char* contents, Element element) {
  const char kind = array[0] == '{' ? 'e' : 'r';
  return _array(array, [&] {
    bytes_ += kEntryBytes;
    return _check(sd_bus_message_enter_container(message_, kind, contents)) && element() &&
           _check(sd_bus_message_exit_container(message_));
  });
}

template <typename T>
bool WireReader::_value(Value& out, bool (WireReader::*reader)(T&)) {
  return (this->*reader)(out.variant.emplace<T>());
}

template <typename T>
bool WireReader::_list(const char* contents, T& out,
                       bool (WireReader::*reader)(typename T::value_type&)) {
  return _array(contents, [&] {
    bytes_ += sizeof(Value);
    return (this->*reader)(out.emplace_back());
  });
}

bool WireReader::_stringMap(StringMap& out) {
  return _entries("{ss}", "ss", [&] {
    std::string key;
    return _string(key) && _string(out[std::move(key)]);
  });
}

bool WireReader::_stringPairs(StringPairs& out) {
  return _entries("(ss)", "ss", [&] {
    auto& pair = out.emplace_back();
    return _string(pair.first) && _string(pair.second);
  });
}

bool WireReader::_integerMap(IntegerMap& out) {
  return _entries("{sx}", "sx", [&] {
    std::string key;
    return _string(key) && _check(sd_bus_message_read_basic(message_, 'x', &out[std::move(key)]));
  });
}

bool WireReader::_dataMap(DataMap& out) {
  return _entries("{say}", "say", [&] {
    auto& entry = out.emplace_back();
    return _string(entry.first) && _data(entry.second);
  });
}

bool WireReader::_dictionary(Dictionary& out) {
  if (++depth_ > kMaximumDecodingDepth) return _overLimit("dictionaries are nested too deeply");
  const bool complete = _entries("{sv}", "sv", [&] {
    std::string key;
    Value value;
    if (!_string(key) || !_variant(value)) return false;
    out.insert_or_assign(std::move(key), std::move(value));
    return true;
  });
  --depth_;
  return complete;
}

bool WireReader::_variant(Value& out) {
  char type = 0;
  const char* contents = nullptr;
  if (!_check(sd_bus_message_peek_type(message_, &type, &contents))) return false;
  if (type != 'v' || !contents) return _check(-EBADMSG);
  const std::string signature(contents);
  return _check(sd_bus_message_enter_container(message_, 'v', signature.c_str())) &&
         read(signature, out) && _check(sd_bus_message_exit_container(message_));
}

bool WireReader::_skipVariant(std::string type, Value& out) {
  if (!_check(sd_bus_message_skip(message_, type.c_str()))) return false;
  bytes_ += type.size();
  out.variant = Unsupported{std::move(type)};
  return true;
}

bool WireReader::read(std::string_view type, Value& out) {
  using R = WireReader;
  static constexpr WireType kTypes[] = {
      {"s", [](R& r, Value& v) { return r._value(v, &R::_string); }},
      {"x", [](R& r, Value& v) { return r._number<'x', std::int64_t, std::int64_t>(v); }},
      {"a{sv}", [](R& r, Value& v) { return r._value(v, &R::_dictionary); }},
      {"ay", [](R& r, Value& v) { return r._value(v, &R::_data); }},
      {"b", [](R& r, Value& v) { return r._number<'b', int, bool>(v); }},
      {"i", [](R& r, Value& v) { return r._number<'i', std::int32_t, std::int32_t>(v); }},
      {"u", [](R& r, Value& v) { return r._number<'u', std::uint32_t, std::uint32_t>(v); }},
      {"t", [](R& r, Value& v) { return r._number<'t', std::uint64_t, std::uint64_t>(v); }},
      {"d", [](R& r, Value& v) { return r._number<'d', double, double>(v); }},
      {"h", [](R& r, Value& v) { return r._value(v, &R::_handle); }},
      {"a(ss)", [](R& r, Value& v) { return r._value(v, &R::_stringPairs); }},
      {"a{ss}", [](R& r, Value& v) { return r._value(v, &R::_stringMap); }},
      {"as",
       [](R& r, Value& v) { return r._list("s", v.variant.emplace<Strings>(), &R::_string); }},
      {"ah",
       [](R& r, Value& v) { return r._list("h", v.variant.emplace<FileHandles>(), &R::_handle); }},
      {"aa{ss}",
       [](R& r, Value& v) {
         return r._list("a{ss}", v.variant.emplace<std::vector<StringMap>>(), &R::_stringMap);
       }},
      {"aa{sv}",
       [](R& r, Value& v) {
         return r._list("a{sv}", v.variant.emplace<std::vector<Dictionary>>(), &R::_dictionary);
       }},
      {"a{sx}", [](R& r, Value& v) { return r._value(v, &R::_integerMap); }},
      {"a{say}", [](R& r, Value& v) { return r._value(v, &R::_dataMap); }},
  };
  for (const auto& known : kTypes) {
    if (known.signature == type) return known.read(*this, out);
  }
  return _skipVariant(std::string(type), out);
}

std::size_t lengthOfCompleteType(std::string_view signature) {
  if (signature.empty()) return 0;
  if (signature[0] == 'a') return 1 + lengthOfCompleteType(signature.substr(1));
  if (signature[0] != '(' && signature[0] != '{') return 1;
  std::size_t open = 0;
  for (std::size_t at = 0; at < signature.size(); ++at) {
    if (signature[at] == '(' || signature[at] == '{') ++open;
    if ((signature[at] == ')' || signature[at] == '}') && --open == 0) return at + 1;
  }
  return signature.size();
}

}  // namespace

std::string_view firstCompleteType(std::string_view signature) {
  return signature.substr(0, lengthOfCompleteType(signature));
}

std::variant<Decoded, DecodeFailure> decodeArguments(sd_bus_message* message,
                                                     std::string_view signature,
                                                     const Limits& limits) {
  const char* actual = sd_bus_message_get_signature(message, 1);
  if (!actual) return DecodeFailure{DecodeFailure::Kind::Malformed, "malformed message"};
  if (signature != actual) {
    return DecodeFailure{DecodeFailure::Kind::WrongType,
                         "arguments are of type \"" + std::string(actual) + "\", expected \"" +
                             std::string(signature) + "\""};
  }
  WireReader reader(message, limits);
  Decoded decoded;
  while (!signature.empty()) {
    const auto type = firstCompleteType(signature);
    signature.remove_prefix(type.size());
    if (!reader.read(type, decoded.values.emplace_back())) return reader.failure();
  }
  decoded.bytes = reader.bytes();
  return decoded;
}

}  // namespace zelkord::ipc
