#pragma once

#include <functional>
#include <memory>
#include <string>
#include <thread>

#include "base/Namespace.h"
#include "platform/linux/files/Descriptor.h"

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

enum class BusEnd { Stopped, Lost };

// Dispatches the connection on this thread until `stop`, an eventfd, can be read or the bus is
// gone. `ready` runs once the bus has taken the connection.
BusEnd dispatchBus(sd_bus* bus, int stop, const std::function<void()>& ready);

// A thread that dispatches one bus connection until it is destroyed or the bus is gone.
//
// Threading: the connection belongs to the thread once `start` was called; every call-back
// registered on it runs there and must not wait. Destroying or stopping this waits for the
// call-back that runs; not on the thread itself.
class BusThread final {
 public:
  explicit BusThread(BusConnection bus);
  ~BusThread();
  BusThread(const BusThread&) = delete;
  BusThread& operator=(const BusThread&) = delete;

  sd_bus* bus() const { return bus_.get(); }
  // Call once, when everything is registered. `lost` runs on the thread when the bus goes away by
  // itself.
  void start(std::function<void()> lost);
  // No call-back runs after this: for owners whose call-backs look at this object.
  void stop();

 private:
  const BusConnection bus_;
  const Descriptor stop_;
  std::thread thread_;
};

}  // namespace zelkord
