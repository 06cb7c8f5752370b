#pragma once

#include <map>
#include <string>
#include <string_view>

#include "base/Namespace.h"

namespace zelkord {

// The assignments of an os-release file: shell syntax without expansion. Lines that are none are
// passed over.
std::map<std::string, std::string> parseOsRelease(std::string_view text);

}  // namespace zelkord
