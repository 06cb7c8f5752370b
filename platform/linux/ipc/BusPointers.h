#pragma once

#include <systemd/sd-bus.h>

#include <memory>

namespace zelkord::ipc {

// sd-bus objects with an owner. None of them is thread-safe: they live and die on the loop, which
// one thread has at a time.
struct BusDeleter {
  void operator()(sd_bus* bus) const { sd_bus_close_unref(bus); }
  void operator()(sd_bus_message* message) const { sd_bus_message_unref(message); }
  void operator()(sd_bus_slot* slot) const { sd_bus_slot_unref(slot); }
};
using BusPtr = std::unique_ptr<sd_bus, BusDeleter>;
using MessagePtr = std::unique_ptr<sd_bus_message, BusDeleter>;
using SlotPtr = std::unique_ptr<sd_bus_slot, BusDeleter>;

}  // namespace zelkord::ipc
