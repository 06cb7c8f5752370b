#pragma once

#include <atomic>
#include <cstdint>
#include <optional>

#include "base/Time.h"

namespace zelkord {

// Where one thread sleeps until another one wakes it. A wake-up that comes first is kept, so none
// is lost.
//
// Threading: one thread parks, any thread wakes it. The waker touches nothing of the parker once
// the parked thread may have gone on, so that it may stand on the stack of the thread that parks.
class Parker {
 public:
  Parker() = default;
  Parker(const Parker&) = delete;
  Parker& operator=(const Parker&) = delete;

  // Returns when woken; false when `limit` passed first.
  bool park(std::optional<Duration> limit = std::nullopt);
  // Takes a wake-up that is there already.
  bool tryTake();
  void unpark();

 private:
  std::atomic<std::uint32_t> state_{0};
};

}  // namespace zelkord
