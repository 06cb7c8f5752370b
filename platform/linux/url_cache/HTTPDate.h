#pragma once

#include <chrono>
#include <optional>
#include <string_view>

#include "base/Namespace.h"

namespace zelkord {

// A date as HTTP headers write it (RFC 9110, 5.6.7), in all three forms; none for anything else.
// A year of two digits lies at most 50 years after `now`.
std::optional<std::chrono::sys_seconds> parseHTTPDate(std::string_view text,
                                                      std::chrono::sys_seconds now);

}  // namespace zelkord
