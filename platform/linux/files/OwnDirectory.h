#pragma once

#include <optional>
#include <string>

#include "base/Error.h"
#include "base/Namespace.h"

namespace zelkord {

// Why a directory that exists cannot be one of the service's own: it is somebody else's. None for
// one that is ours or that nobody has made.
std::optional<Error> foreignDirectory(const std::string& path);

// Closes a directory of ours to everybody else. Gives, for people, what was done or why it could
// not be; none when it was closed already or is not there.
std::optional<std::string> closeToOthers(const std::string& path);

}  // namespace zelkord
