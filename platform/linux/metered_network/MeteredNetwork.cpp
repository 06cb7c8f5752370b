#include "platform/linux/metered_network/MeteredNetwork.h"

#include <systemd/sd-bus.h>

namespace zelkord {
namespace {

constexpr const char* kNetworkManager = "org.freedesktop.NetworkManager";
constexpr const char* kNetworkManagerPath = "/org/freedesktop/NetworkManager";
constexpr const char* kNetworkManagerOwnerChanged =
    "type='signal',sender='org.freedesktop.DBus',path='/org/freedesktop/DBus',"
    "interface='org.freedesktop.DBus',member='NameOwnerChanged',"
    "arg0='org.freedesktop.NetworkManager'";
constexpr const char* kBusProperties = "org.freedesktop.DBus.Properties";

// The values of NMMetered: 0 unknown, 1 yes, 2 no, 3 guessed yes, 4 guessed no.
bool meansMetered(unsigned value) { return value == 1 || value == 3; }

}  // namespace

struct MeteredNetwork::BusCallbacks {
  static int changed(sd_bus_message* signal, void* self, sd_bus_error*) {
    static_cast<MeteredNetwork*>(self)->_read(::sd_bus_message_get_bus(signal));
    return 0;
  }
  static int arrived(sd_bus_message* reply, void* self, sd_bus_error*) {
    unsigned value = 0;
    if (::sd_bus_message_is_method_error(reply, nullptr) ||
        ::sd_bus_message_read(reply, "v", "u", &value) < 0) {
      value = 0;
    }
    static_cast<MeteredNetwork*>(self)->metered_ = meansMetered(value);
    return 0;
  }
};

MeteredNetwork::MeteredNetwork(Loop& host)
    : bus_(host, {[this](sd_bus* bus) { _connected(bus); },
                  [this](const std::string&) { metered_ = false; }}) {
  bus_.start();
}

void MeteredNetwork::_connected(sd_bus* bus) {
  ::sd_bus_match_signal_async(bus, nullptr, kNetworkManager, kNetworkManagerPath, kBusProperties,
                              "PropertiesChanged", BusCallbacks::changed, nullptr, this);
  ::sd_bus_add_match_async(bus, nullptr, kNetworkManagerOwnerChanged, BusCallbacks::changed,
                           nullptr, this);
  _read(bus);
}

void MeteredNetwork::_read(sd_bus* bus) {
  ::sd_bus_call_method_async(bus, nullptr, kNetworkManager, kNetworkManagerPath, kBusProperties,
                             "Get", BusCallbacks::arrived, this, "ss", kNetworkManager, "Metered");
}

}  // namespace zelkord
