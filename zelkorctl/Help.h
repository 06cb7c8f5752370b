#pragma once

#include <string_view>

#include "zelkorctl/Options.h"

namespace zelkorctl {

// What `zelkorctl help COMMAND` prints; the overview for Command::Help.
std::string_view helpText(Command command);

}  // namespace zelkorctl
