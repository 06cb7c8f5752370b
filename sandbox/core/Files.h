#pragma once

#include <sys/types.h>

#include <filesystem>
#include <optional>
#include <string>
#include <string_view>

namespace sandbox {

// The whole file, or nothing when it cannot be read.
std::optional<std::string> readFile(const std::filesystem::path& path);

// Replaces `path` in one step: readers see the old or the new content. False leaves the old one.
bool writeFileAtomically(const std::filesystem::path& path, std::string_view content, mode_t mode);

}  // namespace sandbox
