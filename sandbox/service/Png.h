#pragma once

#include <cstdint>
#include <string>

namespace sandbox {

// A square PNG of one colour (0xRRGGBB) with a lighter disc in it.
std::string pngOfColour(std::uint32_t colour, unsigned size);

}  // namespace sandbox
