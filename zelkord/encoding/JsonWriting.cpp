#include "zelkord/encoding/JsonWriting.h"

#include <array>
#include <charconv>
#include <cmath>

#include "base/Json.h"

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

// Without the white space around it.
std::string_view trimmed(std::string_view json) {
  constexpr std::string_view kSpace = " \t\r\n";
  const auto begin = json.find_first_not_of(kSpace);
  return json.substr(begin, json.find_last_not_of(kSpace) - begin + 1);
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

void appendJsonString(std::string_view value, std::string& text) {
  text += '"';
  std::size_t plain = 0;  // where the run that needs no escape begins
  for (std::size_t i = 0; i < value.size(); ++i) {
    const auto character = static_cast<unsigned char>(value[i]);
    const char escape = kEscapes[character];
    if (escape == 0) continue;
    text.append(value, plain, i - plain);
    appendEscaped(character, escape, text);
    plain = i + 1;
  }
  text.append(value, plain);
  text += '"';
}

bool appendJsonNumber(double value, std::string& text) {
  if (!std::isfinite(value)) return false;
  appendNumber(value, text);
  return true;
}

void appendJsonInteger(std::int64_t value, std::string& text) { appendNumber(value, text); }
void appendJsonInteger(std::uint64_t value, std::string& text) { appendNumber(value, text); }

void appendJsonKey(std::string_view key, std::size_t begin, std::string& text) {
  if (text.size() > begin) text += ',';
  appendJsonString(key, text);
  text += ':';
}

bool appendJson(const JsonText& value, std::string& text) {
  text += isJson(value.text) ? trimmed(value.text) : "null";
  return true;
}

bool appendJson(const std::map<std::string, std::string>& map, std::string& text) {
  text += '{';
  const auto begin = text.size();
  for (const auto& [key, value] : map) {
    appendJsonKey(key, begin, text);
    appendJsonString(value, text);
  }
  text += '}';
  return true;
}

}  // namespace zelkord
