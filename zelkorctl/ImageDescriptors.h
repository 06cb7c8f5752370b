#pragma once

#include <string_view>
#include <vector>

#include "corezelkor/client/ClientTypes.h"

namespace zelkorctl {

using namespace zelkor;

// The images that a service response describes, wherever in its tree, in its order and each once:
// the dictionaries, alone or in arrays, under the keys that stand for images. Those without "url"
// and "id" are left out. What is no JSON has none.
std::vector<ImageDescriptor> imagesIn(std::string_view data);

}  // namespace zelkorctl
