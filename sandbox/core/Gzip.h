#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

namespace sandbox {

// `text` in the gzip format, at the quickest level.
std::string gzip(std::string_view text);

// A gzip stream that unpacks to `size` blanks in one JSON string, made without holding them.
std::string gzipOfBlanks(std::size_t size);

// Unpacks a complete raw DEFLATE stream. Nothing when it is damaged, ends early, is followed by
// anything, or unpacks to more than `limit` bytes.
std::optional<std::string> inflateRaw(std::string_view packed, std::size_t limit);

}  // namespace sandbox
