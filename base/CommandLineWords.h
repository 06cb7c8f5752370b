#pragma once

#include <string>
#include <vector>

#include "base/Namespace.h"

namespace zelkor {

// A command line's words, with every `--option=` in two, so that an empty value is not taken for a
// missing one whose place the next word fills. What stands behind `--` is left as it is.
std::vector<std::string> withSeparateEmptyValues(const std::vector<std::string>& words);

}  // namespace zelkor
