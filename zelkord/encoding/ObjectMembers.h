#pragma once

#include <span>
#include <string>
#include <string_view>

namespace zelkord {

// Names of members.
using LeftOut = std::span<const std::string_view>;

// Appends the members of an object's text, byte for byte, to a text in which the object's first
// member would stand at `begin`; without those whose names are in `leftOut`, however their names
// are written. Linear in the text's length.
//
// Requires the text of a JSON object.
void appendMembersOfObject(std::string_view object, LeftOut leftOut, std::size_t begin,
                           std::string& text);

}  // namespace zelkord
