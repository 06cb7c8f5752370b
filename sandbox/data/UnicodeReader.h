#pragma once

#include <cstdint>
#include <filesystem>
#include <functional>
#include <string>

#include "sandbox/data/Entry.h"

namespace sandbox {

// Reads UnicodeData.txt, and emoji/emoji-test.txt for the names that people use for emoji.
//
// Each named character that can be shown becomes an entry; ideographs, controls, marks and blanks
// do not. Errors: lines that do not parse and files that are missing are skipped.
void readCharacters(const std::filesystem::path& folder,
                    const std::function<void(SourceEntry)>& yield);

// `c` as UTF-8; empty for a surrogate or a number beyond U+10FFFF.
std::string utf8Of(std::uint32_t c);

}  // namespace sandbox
