#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

#include "base/Time.h"
#include "platform/api/Log.h"

namespace zelkord {

// The level as lines and the command line write it: debug, info, default, error, fault.
std::string_view logLevelName(LogLevel level);
// A level that may be asked for; a fault is always printed and so is none of them.
std::optional<LogLevel> logLevelFromName(std::string_view name);

// The default log has no category of its own.
std::string_view logCategoryName(std::string_view category);

// No line of a file is longer, nor is what goes into the journal.
inline constexpr std::size_t kLongestLogLine = 4096;

// The text, or, when it would make too long a line, its beginning up to a whole character and how
// much is missing.
std::string shortenedLogText(std::string_view text);

// "2026-11-22T19:32:01.123456Z error Zelkor_Connection text", UTC, without a line break at the end.
// Line feed, carriage return, tab and backslash in the text are written as in C, so that an entry
// is a line.
std::string logLine(WallTime time, LogLevel level, std::string_view category,
                    std::string_view text);

}  // namespace zelkord
