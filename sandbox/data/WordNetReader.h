#pragma once

#include <filesystem>
#include <functional>
#include <string>
#include <string_view>

#include "sandbox/data/Entry.h"

namespace sandbox {

// Reads the dictionary files of WordNet: index.*, data.* and cntlist.rev.
//
// Each lemma becomes one entry, whichever parts of speech it has: its description is the most
// frequent sense, its weight comes from how often the lemma was tagged in the counted texts.
// Errors: lines that do not parse and files that are missing are skipped.
void readWordNet(const std::filesystem::path& folder,
                 const std::function<void(SourceEntry)>& yield);

}  // namespace sandbox
