#include "zelkorctl/Printable.h"

#include <fmt/format.h>
#include <unicode/uchar.h>
#include <unicode/utf8.h>

#include <cstdint>

namespace zelkorctl {
namespace {

// The character at `position`, which moves behind it; negative for bytes that are none.
UChar32 nextCharacter(std::string_view text, std::size_t& position) {
  const auto* bytes = reinterpret_cast<const std::uint8_t*>(text.data());
  auto index = static_cast<std::int64_t>(position);
  const auto length = static_cast<std::int64_t>(text.size());
  UChar32 character = 0;
  U8_NEXT(bytes, index, length, character);
  position = static_cast<std::size_t>(index);
  return character;
}

bool mayShow(UChar32 character) {
  switch (u_charType(character)) {
    case U_CONTROL_CHAR:
    case U_FORMAT_CHAR:  // direction overrides and other invisible ones
    case U_LINE_SEPARATOR:
    case U_PARAGRAPH_SEPARATOR:
      return character == 0x200D;  // joins emoji
    default:
      return true;
  }
}

std::string escaped(UChar32 character) {
  switch (character) {
    case '\n':
      return "\\n";
    case '\r':
      return "\\r";
    case '\t':
      return "\\t";
    default:
      break;
  }
  const auto code = static_cast<std::uint32_t>(character);
  if (code < 0x80) return fmt::format("\\x{:02x}", code);
  return code > 0xFFFF ? fmt::format("\\U{:08x}", code) : fmt::format("\\u{:04x}", code);
}

std::size_t widthOf(UChar32 character) {
  switch (u_charType(character)) {
    case U_NON_SPACING_MARK:
    case U_ENCLOSING_MARK:
    case U_FORMAT_CHAR:
      return 0;
    default:
      break;
  }
  const int width = u_getIntPropertyValue(character, UCHAR_EAST_ASIAN_WIDTH);
  return width == U_EA_WIDE || width == U_EA_FULLWIDTH ? 2 : 1;
}

}  // namespace

std::string printable(std::string_view text) {
  std::string result;
  for (std::size_t position = 0; position < text.size();) {
    const auto start = position;
    const auto character = nextCharacter(text, position);
    if (character < 0) {
      for (auto i = start; i < position; ++i) {
        result += fmt::format("\\x{:02x}", static_cast<std::uint8_t>(text[i]));
      }
    } else if (character == '\\') {
      result += "\\\\";
    } else if (mayShow(character)) {
      result += text.substr(start, position - start);
    } else {
      result += escaped(character);
    }
  }
  return result;
}

std::size_t displayWidth(std::string_view text) {
  std::size_t width = 0;
  for (std::size_t position = 0; position < text.size();) {
    width += widthOf(nextCharacter(text, position));
  }
  return width;
}

std::string fitted(std::string_view text, std::size_t width) {
  if (displayWidth(text) <= width) return std::string(text);
  if (width == 0) return {};
  std::size_t used = 1;  // the ellipsis
  std::size_t end = 0;
  for (std::size_t position = 0; position < text.size();) {
    used += widthOf(nextCharacter(text, position));
    if (used > width) break;
    end = position;
  }
  return std::string(text.substr(0, end)) + "…";
}

std::string padded(std::string_view text, std::size_t width) {
  auto result = fitted(text, width);
  result.append(width - displayWidth(result), ' ');
  return result;
}

}  // namespace zelkorctl
