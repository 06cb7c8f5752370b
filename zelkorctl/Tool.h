#pragma once

#include <string>
#include <vector>

#include "zelkorctl/Surroundings.h"

namespace zelkorctl {

// The whole tool: the arguments without the program's name; gives the exit status.
int runTool(const std::vector<std::string>& arguments, const Surroundings& surroundings);

}  // namespace zelkorctl
