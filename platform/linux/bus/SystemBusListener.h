#pragma once

#include <functional>
#include <memory>
#include <string>

#include "base/Time.h"
#include "platform/linux/bus/BusWatch.h"

namespace zelkord {

// Listens to the system bus for as long as it lives, however often the bus goes away.
//
// States: connected; away, after a connection was lost or none could be had: it tries again, first
// after `kShortestBusRetry`, then after twice the time before, at most after `kLongestBusRetry`.
//
// Threading: events, and every call-back registered on the connection, run on the loop and must not
// wait. Stopping or destroying this waits for the one that runs; not on the loop itself.
// Ownership: the loop outlives it.
class SystemBusListener final {
 public:
  struct Events {
    // A new connection, on which to register call-backs and send calls. It ends before `away`.
    std::function<void(sd_bus*)> connected;
    // There is none; once for each time that it goes, or is not there at first.
    std::function<void(const std::string& problem)> away;
  };

  SystemBusListener(Loop& loop, Events events);
  ~SystemBusListener();
  SystemBusListener(const SystemBusListener&) = delete;
  SystemBusListener& operator=(const SystemBusListener&) = delete;

  // Call once.
  void start();
  // No event and no call-back runs after this.
  void stop();

 private:
  void _connect() ZK_REQUIRES(loop_);
  void _ready() ZK_REQUIRES(loop_);
  void _lost(const std::string& problem) ZK_REQUIRES(loop_);

  // Fixed after construction.
  Loop& loop_;
  const Events events_;

  // The owner's.
  bool started_ = false;

  // The loop's.
  std::unique_ptr<BusWatch> bus_ ZK_ON(loop_);
  bool isAway_ ZK_ON(loop_) = false;
  Duration pause_ ZK_ON(loop_);
  Subscription retry_ ZK_ON(loop_);
};

inline constexpr Duration kShortestBusRetry = 250ms;
inline constexpr Duration kLongestBusRetry = 300s;

}  // namespace zelkord
