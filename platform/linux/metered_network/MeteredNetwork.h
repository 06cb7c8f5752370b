#pragma once

#include <atomic>
#include <memory>

#include "platform/linux/bus/SystemBus.h"

namespace zelkord {

// Whether the network costs its user money, as NetworkManager on the system bus says; not, where
// there is none.
//
// Threading: any thread. Follows changes on a thread of its own, which sleeps in between.
// Errors: none; what cannot be read counts as not metered.
class MeteredNetwork final {
 public:
  MeteredNetwork();

  bool isMetered() const { return metered_; }

 private:
  struct BusCallbacks;
  void _read();

  std::atomic<bool> metered_ = false;
  std::unique_ptr<BusThread> bus_;  // last: its thread ends first
};

}  // namespace zelkord
