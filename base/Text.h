#pragma once

#include <cstddef>
#include <string>
#include <string_view>

#include "base/Export.h"
#include "base/Namespace.h"

namespace zelkor {

// The length of a UTF-8 text in UTF-16 code units, the unit of every length in this system.
ZK_EXPORT std::size_t utf16Length(std::string_view utf8);

ZK_EXPORT bool isValidUtf8(std::string_view bytes);

// U+0000 to U+001F and U+007F to U+009F. Requires valid UTF-8.
ZK_EXPORT bool hasControlCharacters(std::string_view utf8);

// U+FFFE and U+FFFF of every plane, U+FDD0 to U+FDEF: valid in UTF-8, but refused by what carries
// messages. Bytes that are not UTF-8 are none.
ZK_EXPORT bool hasNoncharacters(std::string_view text);
// Each of them as U+FFFD; everything else as it is.
ZK_EXPORT std::string replaceNoncharacters(std::string_view text);
// A JSON document with them as \u escapes.
ZK_EXPORT std::string withEscapedNoncharacters(std::string json);

// Lower-cased with the root locale.
ZK_EXPORT std::string lowercased(std::string_view utf8);
ZK_EXPORT std::string uppercased(std::string_view utf8);

// Whether `text` contains `part`, both lower-cased first.
ZK_EXPORT bool containsIgnoringCase(std::string_view text, std::string_view part);

// Compares as people read numbers: runs of digits compare by value, everything else by code unit.
// Negative, zero or positive like strcmp.
ZK_EXPORT int compareNumerically(std::string_view a, std::string_view b);

// Orders by UTF-16 code unit (which differs from UTF-8 byte order above U+FFFF).
ZK_EXPORT bool lessByCodeUnit(std::string_view a, std::string_view b);

}  // namespace zelkor
