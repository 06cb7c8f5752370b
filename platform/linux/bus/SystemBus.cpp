#include "platform/linux/bus/SystemBus.h"

#include <systemd/sd-bus.h>

#include <cstdint>
#include <cstring>

namespace zelkord {
namespace {

constexpr std::uint64_t kBusCallMicroseconds = 1'000'000;

}  // namespace

void BusCloser::operator()(sd_bus* bus) const { ::sd_bus_flush_close_unref(bus); }

BusConnection openSystemBus(std::string* problem) {
  sd_bus* raw = nullptr;
  const int result = ::sd_bus_open_system(&raw);
  if (result < 0 && problem) *problem = std::strerror(-result);
  return BusConnection(result < 0 ? nullptr : raw);
}

std::string readBusProperty(sd_bus* bus, const char* service, const char* path,
                            const char* interface, const char* property) {
  sd_bus_message* call = nullptr;
  sd_bus_message* reply = nullptr;
  std::string text;
  const char* value = nullptr;
  if (::sd_bus_message_new_method_call(bus, &call, service, path, "org.freedesktop.DBus.Properties",
                                       "Get") >= 0 &&
      ::sd_bus_message_append(call, "ss", interface, property) >= 0 &&
      ::sd_bus_call(bus, call, kBusCallMicroseconds, nullptr, &reply) >= 0 &&
      ::sd_bus_message_read(reply, "v", "s", &value) >= 0) {
    text = value;
  }
  ::sd_bus_message_unref(call);
  ::sd_bus_message_unref(reply);
  return text;
}

}  // namespace zelkord
