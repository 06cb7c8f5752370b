#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "corezelkor/client/internal/BusPointers.h"

namespace zelkord::bench {

// Asks an endpoint for the images and gives the sum of the sizes of those that came. Throws
// std::runtime_error when the call fails.
std::size_t loadImages(sd_bus* endpoint, const std::vector<std::string>& urls);

}  // namespace zelkord::bench
