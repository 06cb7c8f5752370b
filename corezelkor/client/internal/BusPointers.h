#pragma once

#include <systemd/sd-bus.h>

#include <memory>

namespace zelkor {

// sd-bus objects with an owner. They live and die on the client's thread.
struct BusRelease {
  void operator()(sd_bus* bus) const { sd_bus_close_unref(bus); }
  void operator()(sd_bus_message* message) const { sd_bus_message_unref(message); }
  void operator()(sd_bus_slot* slot) const { sd_bus_slot_unref(slot); }
};
using BusPointer = std::unique_ptr<sd_bus, BusRelease>;
using MessagePointer = std::unique_ptr<sd_bus_message, BusRelease>;
using SlotPointer = std::unique_ptr<sd_bus_slot, BusRelease>;

}  // namespace zelkor
