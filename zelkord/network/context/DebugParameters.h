#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "corezelkor/Messages.h"

namespace zelkord {

// The query items that a developer adds to most requests.
struct DebugParameters {
  std::vector<QueryItem> items;
  std::string invalid;  // the first piece that is not one
  bool valid = true;
};

// Reads "name=value&name=value". Every piece has exactly one "="; one that has not makes the whole
// text invalid, and there are no items then. An empty text is valid and gives none.
DebugParameters parseDebugParameters(std::string_view text);

}  // namespace zelkord
