#pragma once

#include "base/Time.h"

namespace zelkord {

// What time it is. Both clocks follow the simulation rate: real time at start plus rate times what
// elapsed. Threading: any thread; at most tens of nanoseconds.
class Clock {
 public:
  virtual ~Clock() = default;
  virtual SteadyTime now() const = 0;
  virtual WallTime wallNow() const = 0;
  // Steady time that ignores the simulation rate: for request timing and waits that stay real.
  virtual SteadyTime realNow() const = 0;
};

}  // namespace zelkord
