#pragma once

#include <cstddef>

namespace zelkord::bench {

// What `new` has given out and not got back, as the allocator counts it: what a block really takes,
// its header included.
std::size_t allocatedBytes();

}  // namespace zelkord::bench
