#include "platform/linux/metered_network/MeteredNetwork.h"

#include <systemd/sd-bus.h>

namespace zelkord {
namespace {

constexpr const char* kNetworkManager = "org.freedesktop.NetworkManager";
constexpr const char* kNetworkManagerPath = "/org/freedesktop/NetworkManager";
constexpr const char* kBusProperties = "org.freedesktop.DBus.Properties";

// The values of NMMetered: 0 unknown, 1 yes, 2 no, 3 guessed yes, 4 guessed no.
bool meansMetered(unsigned value) { return value == 1 || value == 3; }

}  // namespace

struct MeteredNetwork::BusCallbacks {
  static int changed(sd_bus_message*, void* self, sd_bus_error*) {
    static_cast<MeteredNetwork*>(self)->_read();
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

MeteredNetwork::MeteredNetwork() {
  auto connection = openSystemBus(nullptr);
  if (!connection) return;
  bus_ = std::make_unique<BusThread>(std::move(connection));
  ::sd_bus_match_signal_async(bus_->bus(), nullptr, kNetworkManager, kNetworkManagerPath,
                              kBusProperties, "PropertiesChanged", BusCallbacks::changed, nullptr,
                              this);
  _read();
  bus_->start([this] { metered_ = false; });
}

void MeteredNetwork::_read() {
  ::sd_bus_call_method_async(bus_->bus(), nullptr, kNetworkManager, kNetworkManagerPath,
                             kBusProperties, "Get", BusCallbacks::arrived, this, "ss",
                             kNetworkManager, "Metered");
}

}  // namespace zelkord
