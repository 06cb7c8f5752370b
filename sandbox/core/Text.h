#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace sandbox {

// `text` with every byte that is not UTF-8 replaced by U+FFFD.
std::string validUtf8(std::string_view text);

// Lower case by the root locale.
std::string lowerCased(std::string_view text);

// The form in which texts are indexed and compared: case and diacritics folded, '_' and '-' are
// blanks, blanks joined, none at the ends. Bytes that are not UTF-8 become U+FFFD.
std::string foldTerm(std::string_view text);

// The same for something being typed: one blank at the end stays, since it ends a word.
std::string foldQuery(std::string_view text);

std::vector<std::string_view> split(std::string_view text, char separator);

}  // namespace sandbox
