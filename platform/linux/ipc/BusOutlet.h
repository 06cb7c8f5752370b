#pragma once

#include <functional>
#include <string>
#include <utility>

#include "platform/linux/ipc/Outlet.h"

namespace zelkord::ipc {

// What leaves for one bus client. A connection that has ended leaves its outlet behind: late
// answers stop there, also when the same client has begun another connection.
//
// Threading: the loop. Ownership: its bus caller.
class BusOutlet final : public Outlet {
 public:
  using Send = std::function<void(MessagePtr message, std::size_t bytes)>;

  BusOutlet(sd_bus* bus, std::string destination, Send send, std::function<void()> invalidate)
      : bus_(bus),
        destination_(std::move(destination)),
        send_(std::move(send)),
        invalidate_(std::move(invalidate)) {}

  void end() { bus_ = nullptr; }

  sd_bus* bus() override { return bus_; }
  const std::string& destination() const override { return destination_; }
  void send(MessagePtr message, std::size_t bytes) override {
    if (bus_) send_(std::move(message), bytes);
  }
  void invalidate() override {
    if (bus_) invalidate_();
  }

 private:
  sd_bus* bus_;
  const std::string destination_;
  const Send send_;
  const std::function<void()> invalidate_;
};

}  // namespace zelkord::ipc
