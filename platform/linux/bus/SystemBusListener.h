#pragma once

#include <functional>
#include <string>
#include <thread>

#include "base/Time.h"
#include "platform/linux/bus/SystemBus.h"

namespace zelkord {

// Listens to the system bus for as long as it lives, however often the bus goes away.
//
// States: connected; away, after a connection was lost or none could be had: it tries again, first
// after `kShortestBusRetry`, then after twice the time before, at most after `kLongestBusRetry`.
//
// Threading: events, and every call-back registered on the connection, run on the listener's own
// thread and must not wait. Stopping or destroying this waits for the one that runs; not on the
// thread itself.
class SystemBusListener final {
 public:
  struct Events {
    // A new connection, on which to register call-backs and send calls. It ends before `away`.
    std::function<void(sd_bus*)> connected;
    // There is none; once for each time that it goes, or is not there at first.
    std::function<void(const std::string& problem)> away;
  };

  explicit SystemBusListener(Events events);
  ~SystemBusListener();
  SystemBusListener(const SystemBusListener&) = delete;
  SystemBusListener& operator=(const SystemBusListener&) = delete;

  // Call once.
  void start();
  // No event and no call-back runs after this.
  void stop();

 private:
  void _run();
  BusEnd _listen();
  void _tellAway(const std::string& problem);
  // False when this was stopped meanwhile.
  bool _pause();

  const Events events_;
  const Descriptor stop_;
  std::thread thread_;

  // Of the thread.
  bool isAway_ = false;
  Duration pause_;
};

inline constexpr Duration kShortestBusRetry = 250ms;
inline constexpr Duration kLongestBusRetry = 300s;

}  // namespace zelkord
