#include "sandbox/core/Text.h"

#include <unicode/locid.h>
#include <unicode/normalizer2.h>
#include <unicode/uchar.h>
#include <unicode/unistr.h>

#include <algorithm>

namespace sandbox {

namespace {

bool isAscii(std::string_view text) {
  return std::all_of(text.begin(), text.end(),
                     [](char c) { return static_cast<unsigned char>(c) < 0x80; });
}

char asciiLower(char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; }

bool isBlank(char c) {
  return c == ' ' || c == '_' || c == '-' || c == '\t' || c == '\n' || c == '\r';
}

// Letters that do not decompose but are commonly typed without their stroke.
const char* plainForm(UChar32 c) {
  switch (c) {
    case 0xE6:
      return "ae";
    case 0xF0:
    case 0x111:
      return "d";
    case 0xF8:
      return "o";
    case 0xFE:
      return "th";
    case 0x131:
      return "i";
    case 0x142:
      return "l";
    case 0x153:
      return "oe";
    case 0x2019:
      return "'";
    default:
      return nullptr;
  }
}

// Compatibility decomposition, case folding, no marks.
std::string foldUnicode(std::string_view text) {
  UErrorCode status = U_ZERO_ERROR;
  const auto* decompose = icu::Normalizer2::getNFKDInstance(status);
  auto wide = icu::UnicodeString::fromUTF8(
      icu::StringPiece(text.data(), static_cast<int32_t>(text.size())));
  if (U_SUCCESS(status)) wide = decompose->normalize(wide.foldCase(), status);
  wide.foldCase();
  icu::UnicodeString kept;
  for (int32_t at = 0; at < wide.length(); at = wide.moveIndex32(at, 1)) {
    const UChar32 c = wide.char32At(at);
    if (u_charType(c) == U_NON_SPACING_MARK) continue;
    if (const char* plain = plainForm(c))
      kept.append(icu::UnicodeString(plain));
    else
      kept.append(c);
  }
  std::string folded;
  return kept.toUTF8String(folded);
}

std::string joinBlanks(std::string_view text) {
  std::string joined;
  joined.reserve(text.size());
  for (const char c : text) {
    if (!isBlank(c))
      joined.push_back(asciiLower(c));
    else if (!joined.empty() && joined.back() != ' ')
      joined.push_back(' ');
  }
  return joined;
}

}  // namespace

std::string validUtf8(std::string_view text) {
  if (isAscii(text)) return std::string(text);
  std::string valid;
  return icu::UnicodeString::fromUTF8(
             icu::StringPiece(text.data(), static_cast<int32_t>(text.size())))
      .toUTF8String(valid);
}

std::string lowerCased(std::string_view text) {
  std::string lower(text);
  if (isAscii(text)) {
    std::transform(lower.begin(), lower.end(), lower.begin(), asciiLower);
    return lower;
  }
  auto wide = icu::UnicodeString::fromUTF8(
      icu::StringPiece(text.data(), static_cast<int32_t>(text.size())));
  lower.clear();
  return wide.toLower(icu::Locale::getRoot()).toUTF8String(lower);
}

std::string foldQuery(std::string_view text) {
  return isAscii(text) ? joinBlanks(text) : joinBlanks(foldUnicode(text));
}

std::string foldTerm(std::string_view text) {
  std::string folded = foldQuery(text);
  if (!folded.empty() && folded.back() == ' ') folded.pop_back();
  return folded;
}

std::vector<std::string_view> split(std::string_view text, char separator) {
  std::vector<std::string_view> parts;
  for (;;) {
    const std::size_t end = text.find(separator);
    parts.push_back(text.substr(0, end));
    if (end == std::string_view::npos) return parts;
    text.remove_prefix(end + 1);
  }
}

}  // namespace sandbox
