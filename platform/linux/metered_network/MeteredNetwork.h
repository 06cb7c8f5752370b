#pragma once

#include <atomic>

#include "platform/linux/bus/SystemBusListener.h"

namespace zelkord {

// Whether the network costs its user money, as NetworkManager on the system bus says; not, where
// there is none.
//
// Threading: any thread. Follows changes on the host's loop. Ownership: that outlives it.
// Errors: none; what cannot be read counts as not metered, and is read again when NetworkManager or
// the bus come back.
class MeteredNetwork final {
 public:
  explicit MeteredNetwork(Loop& host);

  bool isMetered() const { return metered_; }

 private:
  struct BusCallbacks;
  void _connected(sd_bus* bus);
  void _read(sd_bus* bus);

  std::atomic<bool> metered_ = false;
  SystemBusListener bus_;  // last: it ends first
};

}  // namespace zelkord
