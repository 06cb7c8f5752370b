#pragma once

#include <filesystem>
#include <functional>

#include "sandbox/data/Entry.h"

namespace sandbox {

// Reads the JSON files of the ISO code lists: countries, their regions, currencies and languages. A
// country or region gets the flag image of its country when `flags` has one.
//
// Errors: a file or record that is missing or malformed is skipped.
void readIsoCodes(const std::filesystem::path& folder, const std::filesystem::path& flags,
                  const std::function<void(SourceEntry)>& yield);

}  // namespace sandbox
