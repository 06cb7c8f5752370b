#include "base/Text.h"

#include <fmt/format.h>
#include <unicode/bytestream.h>
#include <unicode/casemap.h>
#include <unicode/stringpiece.h>
#include <unicode/utf.h>
#include <unicode/utf16.h>
#include <unicode/utf8.h>

#include <algorithm>
#include <cstdint>
#include <cstring>

namespace zelkor {
namespace {

bool isAscii(std::string_view text) {
  return std::all_of(text.begin(), text.end(), [](unsigned char c) { return c < 0x80; });
}

bool beginsWithEightOfAscii(std::string_view text) {
  std::uint64_t word = 0;
  if (text.size() < sizeof word) return false;
  std::memcpy(&word, text.data(), sizeof word);
  return (word & 0x8080808080808080) == 0;
}

// Where the first noncharacter at or after `at` begins; `end` is behind it. The size when there is
// none.
std::size_t findNoncharacter(std::string_view text, std::size_t at, std::size_t& end) {
  const auto size = static_cast<int64_t>(text.size());
  for (auto next = static_cast<int64_t>(at); next < size;) {
    if (beginsWithEightOfAscii(text.substr(static_cast<std::size_t>(next)))) {
      next += 8;
      continue;
    }
    const auto begin = next;
    UChar32 point = 0;
    U8_NEXT(text.data(), next, size, point);
    end = static_cast<std::size_t>(next);
    if (point >= 0 && U_IS_UNICODE_NONCHAR(point)) return static_cast<std::size_t>(begin);
  }
  return text.size();
}

bool isDigit(char c) { return c >= '0' && c <= '9'; }

// The character at `at`, which moves behind it, as UTF-16 in JSON's form.
void appendEscaped(std::string& json, std::string_view utf8, std::size_t& at) {
  auto next = static_cast<int64_t>(at);
  UChar32 point = 0;
  U8_NEXT(utf8.data(), next, static_cast<int64_t>(utf8.size()), point);
  at = static_cast<std::size_t>(next);
  json += point <= 0xFFFF
              ? fmt::format("\\u{:04x}", point)
              : fmt::format("\\u{:04x}\\u{:04x}", int{U16_LEAD(point)}, int{U16_TRAIL(point)});
}

using AsciiMap = char (*)(char);
using UnicodeMap = void (*)(icu::StringPiece, icu::ByteSink&, UErrorCode&);

std::string mapCase(std::string_view text, AsciiMap ascii, UnicodeMap unicode) {
  std::string mapped;
  if (isAscii(text)) {
    mapped.resize(text.size());
    std::transform(text.begin(), text.end(), mapped.begin(), ascii);
    return mapped;
  }
  UErrorCode status = U_ZERO_ERROR;
  icu::StringByteSink<std::string> sink(&mapped);
  unicode(icu::StringPiece(text.data(), static_cast<int32_t>(text.size())), sink, status);
  return U_SUCCESS(status) ? mapped : std::string(text);
}

// The run of digits at `at`, without leading zeros; `at` moves behind it.
std::string_view takeNumber(std::string_view text, std::size_t& at) {
  while (at < text.size() && text[at] == '0') ++at;
  const auto begin = at;
  while (at < text.size() && isDigit(text[at])) ++at;
  return text.substr(begin, at - begin);
}

}  // namespace

std::size_t utf16Length(std::string_view utf8) {
  std::size_t length = 0;
  for (const unsigned char c : utf8) {
    if ((c & 0xC0) != 0x80) length += c >= 0xF0 ? 2 : 1;
  }
  return length;
}

bool isValidUtf8(std::string_view bytes) {
  const auto size = static_cast<int64_t>(bytes.size());
  for (int64_t at = 0; at < size;) {
    if (beginsWithEightOfAscii(bytes.substr(static_cast<std::size_t>(at)))) {
      at += 8;
      continue;
    }
    UChar32 point = 0;
    U8_NEXT(bytes.data(), at, size, point);
    if (point < 0) return false;
  }
  return true;
}

std::string withEscapedNoncharacters(std::string json) {
  if (!hasNoncharacters(json)) return json;
  std::string escaped;
  std::size_t end = 0;
  for (std::size_t at = 0; at < json.size();) {
    const auto next = findNoncharacter(json, at, end);
    escaped.append(json, at, next - at);
    at = next;
    if (at < json.size()) appendEscaped(escaped, json, at);
  }
  return escaped;
}

bool hasControlCharacters(std::string_view utf8) {
  for (std::size_t i = 0; i < utf8.size(); ++i) {
    const auto c = static_cast<unsigned char>(utf8[i]);
    if (c < 0x20 || c == 0x7F) return true;
    if (c == 0xC2 && i + 1 < utf8.size() && static_cast<unsigned char>(utf8[i + 1]) < 0xA0)
      return true;
  }
  return false;
}

bool hasNoncharacters(std::string_view text) {
  std::size_t end = 0;
  return findNoncharacter(text, 0, end) < text.size();
}

std::string replaceNoncharacters(std::string_view text) {
  constexpr std::string_view kReplacement = "\xEF\xBF\xBD";
  std::string replaced;
  std::size_t from = 0;
  std::size_t end = 0;
  for (auto at = findNoncharacter(text, 0, end); at < text.size();
       at = findNoncharacter(text, from, end)) {
    replaced.append(text.substr(from, at - from)).append(kReplacement);
    from = end;
  }
  return replaced.append(text.substr(from));
}

std::string lowercased(std::string_view utf8) {
  return mapCase(
      utf8, [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c + 32) : c; },
      [](icu::StringPiece text, icu::ByteSink& sink, UErrorCode& status) {
        icu::CaseMap::utf8ToLower("", 0, text, sink, nullptr, status);
      });
}

std::string uppercased(std::string_view utf8) {
  return mapCase(
      utf8, [](char c) { return c >= 'a' && c <= 'z' ? static_cast<char>(c - 32) : c; },
      [](icu::StringPiece text, icu::ByteSink& sink, UErrorCode& status) {
        icu::CaseMap::utf8ToUpper("", 0, text, sink, nullptr, status);
      });
}

bool containsIgnoringCase(std::string_view text, std::string_view part) {
  return lowercased(text).find(lowercased(part)) != std::string::npos;
}

int compareNumerically(std::string_view a, std::string_view b) {
  std::size_t i = 0;
  std::size_t j = 0;
  while (i < a.size() && j < b.size()) {
    if (isDigit(a[i]) && isDigit(b[j])) {
      const auto left = takeNumber(a, i);
      const auto right = takeNumber(b, j);
      if (left.size() != right.size()) return left.size() < right.size() ? -1 : 1;
      if (const int order = left.compare(right)) return order;
      continue;
    }
    if (a[i] != b[j])
      return static_cast<unsigned char>(a[i]) < static_cast<unsigned char>(b[j]) ? -1 : 1;
    ++i;
    ++j;
  }
  if (i < a.size()) return 1;
  return j < b.size() ? -1 : 0;
}

bool lessByCodeUnit(std::string_view a, std::string_view b) {
  const auto [i, j] = std::mismatch(a.begin(), a.end(), b.begin(), b.end());
  if (j == b.end()) return false;
  if (i == a.end()) return true;
  // In UTF-16 the surrogates of the supplementary planes (lead bytes F0 to F4) sort below U+E000 to
  // U+FFFF (EE, EF).
  const auto weight = [](char c) {
    const auto byte = static_cast<unsigned char>(c);
    return byte >= 0xEE && byte <= 0xEF ? byte + 0x20 : static_cast<int>(byte);
  };
  return weight(*i) < weight(*j);
}

}  // namespace zelkor
