#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace zelkorctl {

// Text from outside, safe on a terminal: control characters, invisible direction marks and bytes
// that are not UTF-8 become escapes such as \n, \x1b or \u202e; a backslash is doubled.
std::string printable(std::string_view text);

// Columns that a printable text takes on a terminal.
std::size_t displayWidth(std::string_view text);

// Cut to at most `width` columns, with an ellipsis when something is missing.
std::string fitted(std::string_view text, std::size_t width);

// `fitted`, filled up with spaces to `width` columns.
std::string padded(std::string_view text, std::size_t width);

}  // namespace zelkorctl
