#pragma once

#include <functional>

#include "platform/linux/bus/BusWatch.h"

namespace zelkord {

// A bus connection with a loop of its own, until it is destroyed or the bus is gone.
//
// Threading: the connection belongs to the loop once `start` was called; every call-back registered
// on it runs there and must not wait. Destroying or stopping this waits for the call-back that
// runs; not on the loop's thread.
class BusThread final {
 public:
  explicit BusThread(BusConnection bus);
  ~BusThread();
  BusThread(const BusThread&) = delete;
  BusThread& operator=(const BusThread&) = delete;

  sd_bus* bus() const { return watch_.bus(); }
  // Call once, when everything is registered. `lost` runs on the thread when the bus goes away by
  // itself.
  void start(std::function<void()> lost);

 private:
  Loop loop_;
  std::function<void()> lost_;
  BusWatch watch_;
};

}  // namespace zelkord
