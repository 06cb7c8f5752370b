#include "platform/linux/ipc/WireEncoding.h"

#include <cerrno>
#include <type_traits>

#include "base/Text.h"

namespace zelkord::ipc {
namespace {

// Descriptors are scarcer than memory: so few of them may wait in messages.
constexpr std::size_t kBytesForADescriptor = 4u << 20;

constexpr std::string_view kReplacementCharacter = "\xEF\xBF\xBD";

// Replaces every byte that is not part of a valid sequence, every zero byte and every noncharacter.
std::string validText(std::string_view text) {
  std::string valid;
  for (std::size_t at = 0; at < text.size();) {
    std::size_t length = 0;
    for (std::size_t tried = 1; tried <= 4 && length == 0 && text[at] != '\0'; ++tried) {
      if (isValidUtf8(text.substr(at, tried))) length = std::min(tried, text.size() - at);
    }
    const auto character = text.substr(at, length);
    const bool isGood = length > 0 && !hasNoncharacters(character);
    valid += isGood ? character : kReplacementCharacter;
    at += std::max<std::size_t>(length, 1);
  }
  return valid;
}

// What libsystemd takes for a text.
bool isWireText(std::string_view text) {
  return text.find('\0') == std::string_view::npos && isValidUtf8(text) && !hasNoncharacters(text);
}

// Appends values to one message; every operation gives zero or a negative errno.
class WireWriter {
 public:
  explicit WireWriter(sd_bus_message* message) : message_(message) {}

  int write(const Value& value) {
    return std::visit([this](const auto& content) { return _write(content); }, value.variant);
  }

 private:
  int _basic(char type, const void* value) {
    return std::min(0, sd_bus_message_append_basic(message_, type, value));
  }
  // `contents` of the container, and what writes them.
  template <typename Body>
  int _container(char kind, const char* contents, Body body) {
    if (const int r = sd_bus_message_open_container(message_, kind, contents); r < 0) return r;
    if (const int r = body(); r < 0) return r;
    return std::min(0, sd_bus_message_close_container(message_));
  }
  template <typename Range>
  int _array(const char* contents, const Range& range) {
    return _container('a', contents, [&] {
      for (const auto& element : range) {
        if (const int r = _write(element); r < 0) return r;
      }
      return 0;
    });
  }
  // Each element is a pair of key and value.
  template <typename Range>
  int _pairs(char kind, const char* array, const char* contents, const Range& range) {
    return _container('a', array, [&] {
      for (const auto& [key, value] : range) {
        const auto& first = key;
        const auto& second = value;
        const int r = _container(kind, contents, [&] {
          const int failed = _write(first);
          return failed < 0 ? failed : _write(second);
        });
        if (r < 0) return r;
      }
      return 0;
    });
  }

  int _write(bool value) {
    const int wire = value ? 1 : 0;
    return _basic('b', &wire);
  }
  int _write(std::int32_t value) { return _basic('i', &value); }
  int _write(std::uint32_t value) { return _basic('u', &value); }
  int _write(std::int64_t value) { return _basic('x', &value); }
  int _write(std::uint64_t value) { return _basic('t', &value); }
  int _write(double value) { return _basic('d', &value); }
  int _write(const std::string& text) {
    return _basic('s', isWireText(text) ? text.c_str() : validText(text).c_str());
  }
  int _write(const Data& data) {
    return std::min(0, sd_bus_message_append_array(message_, 'y', data.data(), data.size()));
  }
  int _write(const FileHandle& handle) {
    const int descriptor = handle.descriptor();
    return _basic('h', &descriptor);
  }
  int _write(const Strings& list) { return _array("s", list); }
  int _write(const FileHandles& list) { return _array("h", list); }
  int _write(const std::vector<StringMap>& list) { return _array("a{ss}", list); }
  int _write(const std::vector<Dictionary>& list) { return _array("a{sv}", list); }
  int _write(const StringPairs& pairs) { return _pairs('r', "(ss)", "ss", pairs); }
  int _write(const StringMap& map) { return _pairs('e', "{ss}", "ss", map); }
  int _write(const IntegerMap& map) { return _pairs('e', "{sx}", "sx", map); }
  int _write(const DataMap& map) { return _pairs('e', "{say}", "say", map); }
  int _write(const Dictionary& map) { return _pairs('e', "{sv}", "sv", map); }
  int _write(const Unsupported&) { return -EINVAL; }
  int _write(const Value& value) {
    return _container('v', signatureOf(value).c_str(), [&] { return write(value); });
  }

  sd_bus_message* const message_;
};

// Counts what a value takes; 8 bytes stand for alignment and lengths.
struct WireSize {
  std::size_t operator()(const std::string& text) const { return 8 + text.size(); }
  std::size_t operator()(const Data& data) const { return 8 + data.size(); }
  std::size_t operator()(const Unsupported&) const { return 0; }
  std::size_t operator()(const FileHandle&) const { return kBytesForADescriptor; }
  std::size_t operator()(const Value& value) const { return 8 + std::visit(*this, value.variant); }
  template <typename T>
  std::size_t operator()(const T& content) const {
    std::size_t size = 8;
    if constexpr (requires { content.begin(); }) {
      for (const auto& element : content) size += (*this)(element);
    }
    return size;
  }
  template <typename A, typename B>
  std::size_t operator()(const std::pair<A, B>& pair) const {
    return (*this)(pair.first) + (*this)(pair.second);
  }
};

}  // namespace

std::string wireText(std::string_view text) {
  return isWireText(text) ? std::string(text) : validText(text);
}

int encodeValues(sd_bus_message* message, std::string_view signature, const Values& values) {
  if (signatureOf(values) != signature) return -EINVAL;
  WireWriter writer(message);
  for (const auto& value : values) {
    if (const int r = writer.write(value); r < 0) return r;
  }
  return 0;
}

std::size_t encodedSize(const Values& values) {
  return 128 + WireSize()(values);  // 128: the header
}

}  // namespace zelkord::ipc
