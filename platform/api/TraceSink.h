#pragma once

#include <cstdint>

#include "base/Namespace.h"

namespace zelkord {

// The kernel's trace facility: one event a code. Does nothing where there is none.
// Threading: any thread.
class TraceSink {
 public:
  virtual ~TraceSink() = default;
  virtual void emit(std::uint32_t code) = 0;
};

}  // namespace zelkord
