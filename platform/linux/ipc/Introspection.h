#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "platform/api/Interprocess.h"

namespace zelkord::ipc {

// Where every object of the daemon is.
inline constexpr std::string_view kObjectPath = "/com/quenta/zelkord";

// The introspection document of the object at `path`: the interfaces at kObjectPath, the next step
// of the way there above it, empty when there is no such node.
std::string introspectionDocument(std::string_view path, const std::vector<Interface>& interfaces);

}  // namespace zelkord::ipc
