#pragma once

#include "platform/api/RandomSource.h"

namespace zelkord {

// The kernel's random numbers. Small amounts come from a store that each thread keeps, so that not
// every identifier costs a system call; what is handed out is wiped from it. Stops the process when
// there are none. A child that is forked would repeat its parent's: the daemon only starts others.
class SystemRandom final : public RandomSource {
 public:
  void fill(void* bytes, std::size_t count) override;
};

}  // namespace zelkord
