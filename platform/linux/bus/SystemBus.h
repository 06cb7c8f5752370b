#pragma once

#include <memory>
#include <string>

#include "base/Namespace.h"

struct sd_bus;
struct sd_bus_message;

namespace zelkord {

struct BusCloser {
  void operator()(sd_bus* bus) const;
};
using BusConnection = std::unique_ptr<sd_bus, BusCloser>;

// A private connection to the system bus; null, with `problem` set, when there is none.
BusConnection openSystemBus(std::string* problem);

// A text property of a service, waiting for at most a second (an activatable service may have to
// start). Empty on failure.
std::string readBusProperty(sd_bus* bus, const char* service, const char* path,
                            const char* interface, const char* property);

}  // namespace zelkord
