#pragma once

#include <cstdint>
#include <functional>

#include "base/Subscription.h"
#include "platform/linux/bus/SystemBus.h"
#include "platform/linux/loop/Loop.h"
#include "platform/linux/loop/LoopTimer.h"

namespace zelkord {

// One bus connection as a watch on a loop: everything on it is sent, received and called back
// there.
//
// Threading: the loop; made on any thread, which may use the connection until `start`.
// Ownership: the loop outlives it. Destroying it closes the connection; not from a call-back of the
// connection's own, but `lost` may do it.
class BusWatch final {
 public:
  struct Events {
    std::function<void()> ready;  // once, when the bus has taken the connection
    std::function<void()> lost;   // once, when the bus has gone; nothing comes after it
  };

  BusWatch(Loop& loop, BusConnection bus, Events events);
  ~BusWatch();
  BusWatch(const BusWatch&) = delete;
  BusWatch& operator=(const BusWatch&) = delete;

  sd_bus* bus() const { return bus_.get(); }
  // Call once, when everything is registered. Calls nobody back by itself.
  void start();

 private:
  void _pump() ZK_REQUIRES(loop_);
  void _wait() ZK_REQUIRES(loop_);
  void _lose() ZK_REQUIRES(loop_);

  // Fixed after construction.
  Loop& loop_;
  const BusConnection bus_;
  const Events events_;

  // The loop's.
  bool isReady_ ZK_ON(loop_) = false;
  std::uint32_t waitsFor_ ZK_ON(loop_) = 0;
  Subscription watch_ ZK_ON(loop_);
  LoopTimer timer_;
};

}  // namespace zelkord
