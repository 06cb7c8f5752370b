#pragma once

#include <cstddef>

#include "base/Namespace.h"

namespace zelkord {

// Threading: any thread.
class RandomSource {
 public:
  virtual ~RandomSource() = default;
  virtual void fill(void* bytes, std::size_t count) = 0;
};

}  // namespace zelkord
