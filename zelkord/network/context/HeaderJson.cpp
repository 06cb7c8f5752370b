#include "zelkord/network/context/HeaderJson.h"

#include <array>
#include <charconv>
#include <cmath>

#include "base/Text.h"

namespace zelkord {
namespace {

// Appends one value after the other; false as soon as one cannot be said.
class HeaderJsonWriter {
 public:
  bool write(const json::value& value) {
    if (const auto* array = value.if_array()) return _writeArray(*array);
    if (const auto* object = value.if_object()) return _writeObject(*object);
    if (const auto* text = value.if_string()) return _writeString(*text);
    if (const auto* number = value.if_double()) return _writeDouble(*number);
    text_ += json::serialize(value);
    return true;
  }
  std::string take() { return std::move(text_); }

 private:
  bool _writeArray(const json::array& array) {
    char before = '[';
    for (const auto& element : array) {
      text_ += std::exchange(before, ',');
      if (!write(element)) return false;
    }
    text_ += array.empty() ? "[]" : "]";
    return true;
  }

  bool _writeObject(const json::object& object) {
    char before = '{';
    for (const auto& member : object) {
      text_ += std::exchange(before, ',');
      if (!_writeString(member.key())) return false;
      text_ += ':';
      if (!write(member.value())) return false;
    }
    text_ += object.empty() ? "{}" : "}";
    return true;
  }

  bool _writeString(std::string_view text) {
    if (!isValidUtf8(text)) return false;
    for (const char c : json::serialize(json::string(text))) {
      if (c == '\x7f') {
        text_ += "\\u007f";
      } else {
        text_ += c;
      }
    }
    return true;
  }

  bool _writeDouble(double number) {
    if (!std::isfinite(number)) return false;
    std::array<char, 32> digits;
    const auto end = std::to_chars(digits.data(), digits.data() + digits.size(), number).ptr;
    text_.append(digits.data(), end);
    return true;
  }

  std::string text_;
};

}  // namespace

std::optional<std::string> headerJson(const json::value& value) {
  HeaderJsonWriter writer;
  if (!writer.write(value)) return std::nullopt;
  return writer.take();
}

}  // namespace zelkord
