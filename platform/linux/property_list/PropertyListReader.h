#pragma once

#include <optional>

#include "base/Json.h"

namespace zelkord {

// The JSON value of a property-list node (a plist_t) whose depth is bounded. None for what JSON has
// no value for.
std::optional<json::value> jsonOfPropertyList(void* node);

}  // namespace zelkord
