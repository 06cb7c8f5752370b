#include "zelkord/encoding/JsonWriting.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <cstring>

#include "base/Json.h"
#include "base/Text.h"

namespace zelkord {
namespace {

constexpr std::size_t kLongestNumber = 32;

template <typename Number>
void appendNumber(Number value, std::string& text) {
  std::array<char, kLongestNumber> digits;
  const auto end = std::to_chars(digits.data(), digits.data() + digits.size(), value).ptr;
  text.append(digits.data(), end);
}

// What stands behind a backslash for the character; 0: it stands for itself, 'u': its code does.
constexpr auto kEscapes = [] {
  std::array<char, 256> escapes{};
  for (std::size_t code = 0; code < 0x20; ++code) escapes[code] = 'u';
  escapes['"'] = '"';
  escapes['\\'] = '\\';
  escapes['\b'] = 'b';
  escapes['\f'] = 'f';
  escapes['\n'] = 'n';
  escapes['\r'] = 'r';
  escapes['\t'] = 't';
  return escapes;
}();

// Whether the eight bytes at `bytes` are ASCII and stand for themselves: none is below 0x20, a
// quote or a backslash. Each subtraction borrows, and sets a high bit, where a byte is too small.
bool areEightPlain(const char* bytes) {
  constexpr std::uint64_t kOnes = 0x0101010101010101;
  constexpr std::uint64_t kHighBits = kOnes * 0x80;
  std::uint64_t word = 0;
  std::memcpy(&word, bytes, sizeof word);
  const auto low = word - kOnes * 0x20;
  const auto quote = (word ^ kOnes * '"') - kOnes;
  const auto backslash = (word ^ kOnes * '\\') - kOnes;
  return ((word | low | quote | backslash) & kHighBits) == 0;
}

void appendEscaped(unsigned char character, char escape, std::string& text) {
  constexpr std::string_view kDigits = "0123456789abcdef";
  text += '\\';
  text += escape;
  if (escape != 'u') return;
  text += "00";
  text += kDigits[character >> 4];
  text += kDigits[character & 15];
}

}  // namespace

bool appendJsonString(std::string_view value, std::string& text) {
  text += '"';
  std::size_t plain = 0;   // where the run that needs no escape begins
  unsigned char seen = 0;  // the bits of all characters that were looked at singly
  for (std::size_t i = 0; i < value.size();) {
    const auto left = std::min<std::size_t>(value.size() - i, 8);
    if (left == 8 && areEightPlain(value.data() + i)) {
      i += 8;
      continue;
    }
    for (const auto end = i + left; i < end; ++i) {
      const auto character = static_cast<unsigned char>(value[i]);
      seen |= character;
      const char escape = kEscapes[character];
      if (escape == 0) continue;
      text.append(value, plain, i - plain);
      appendEscaped(character, escape, text);
      plain = i + 1;
    }
  }
  text.append(value, plain);
  text += '"';
  return seen < 0x80 || isValidUtf8(value);
}

bool appendJsonNumber(double value, std::string& text) {
  if (!std::isfinite(value)) return false;
  appendNumber(value, text);
  return true;
}

void appendJsonInteger(std::int64_t value, std::string& text) { appendNumber(value, text); }
void appendJsonInteger(std::uint64_t value, std::string& text) { appendNumber(value, text); }

void appendJsonKey(std::string_view key, std::size_t begin, std::string& text) {
  text += text.size() > begin ? ",\"" : "\"";
  text += key;
  text += "\":";
}

bool appendJson(const JsonText& value, std::string& text) {
  text += isJson(value.text) ? trimmedJson(value.text) : std::string_view("null");
  return true;
}

bool appendJson(const JsonObjectText& value, std::string& text) {
  text += isJsonObject(value.text) ? trimmedJson(value.text) : std::string_view("null");
  return true;
}

bool appendJson(const std::map<std::string, std::string>& map, std::string& text) {
  text += '{';
  bool good = true;
  for (const auto& [key, value] : map) {
    if (text.back() != '{') text += ',';
    good = good && appendJsonString(key, text);
    text += ':';
    good = good && appendJsonString(value, text);
  }
  text += '}';
  return good;
}

}  // namespace zelkord
