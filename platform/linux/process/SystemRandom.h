#pragma once

#include "platform/api/Device.h"

namespace zelkord {

// The kernel's random numbers. Stops the process when there are none.
class SystemRandom final : public RandomSource {
 public:
  void fill(void* bytes, std::size_t count) override;
};

}  // namespace zelkord
