#pragma once

#include "base/Time.h"
#include "platform/linux/system/Descriptor.h"

namespace zelkord {

// CLOCK_BOOTTIME: time since boot, suspend included.
SteadyTime steadyNow();

// A timer of the kernel's. Its descriptor can be read once it has gone off.
//
// Threading: any thread; setting it ends what a poll or epoll was waiting for before.
class SteadyTimer final {
 public:
  static constexpr SteadyTime kNever = SteadyTime::max();
  enum class Reads { Wait, DoNotWait };

  explicit SteadyTimer(Reads reads);

  int descriptor() const { return descriptor_.get(); }
  // When it goes off next, at once when that has passed; kNever: not at all.
  void set(SteadyTime time);

 private:
  const Descriptor descriptor_;
};

}  // namespace zelkord
