#include <gtest/gtest.h>
#include <systemd/sd-bus.h>

#include <chrono>
#include <optional>
#include <thread>

#include "platform/linux/bus/BusThread.h"
#include "platform/linux/ipc/IpcTestSupport.h"
#include "platform/linux/metered_network/MeteredNetwork.h"

namespace zelkord {
namespace {

// NetworkManager as far as it matters here. The value changes with a signal, before `start` or on
// its own thread.
class NetworkManagerDouble final {
 public:
  explicit NetworkManagerDouble(unsigned metered)
      : metered_(metered), thread_(openSystemBus(nullptr)) {
    ::sd_bus_add_object_vtable(thread_.bus(), nullptr, "/org/freedesktop/NetworkManager",
                               "org.freedesktop.NetworkManager", kTable, &metered_);
    ::sd_bus_request_name(thread_.bus(), "org.freedesktop.NetworkManager", 0);
    thread_.start([] {});
  }

 private:
  inline static const sd_bus_vtable kTable[] = {
      SD_BUS_VTABLE_START(0),
      SD_BUS_PROPERTY("Metered", "u", nullptr, 0, SD_BUS_VTABLE_PROPERTY_EMITS_CHANGE),
      SD_BUS_VTABLE_END};

  unsigned metered_;
  BusThread thread_;
};

bool becomesMetered(const MeteredNetwork& network, Duration limit) {
  const auto end = std::chrono::steady_clock::now() + limit;
  while (!network.isMetered() && std::chrono::steady_clock::now() < end) {
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
  }
  return network.isMetered();
}

// Its name comes back with a new bus, as its service does.
TEST(MeteredNetworkTest, FollowsABusThatRestarts) {
  const ipc::IpcTestDirectory directory;
  std::optional<ipc::IpcTestBus> bus(directory.path());
  ::setenv("DBUS_SYSTEM_BUS_ADDRESS", bus->address().c_str(), 1);
  std::optional<NetworkManagerDouble> manager(1);
  Loop host("test-host");
  const MeteredNetwork network(host);
  EXPECT_TRUE(becomesMetered(network, ipc::kTestPatience));
  bus->stop();
  EXPECT_TRUE(ipc::eventually([&] { return !network.isMetered(); }));
  bus.emplace(directory.path());
  manager.emplace(3);
  EXPECT_TRUE(becomesMetered(network, ipc::kTestPatience));
  manager.reset();
  EXPECT_TRUE(ipc::eventually([&] { return !network.isMetered(); }));
  ::unsetenv("DBUS_SYSTEM_BUS_ADDRESS");
}

TEST(MeteredNetworkTest, BelievesNetworkManager) {
  const ipc::IpcTestDirectory directory;
  const ipc::IpcTestBus bus{directory.path()};
  ::setenv("DBUS_SYSTEM_BUS_ADDRESS", bus.address().c_str(), 1);
  Loop host("test-host");
  for (const auto& [value, expected] : {std::pair{1u, true}, {3u, true}, {4u, false}}) {
    SCOPED_TRACE(value);
    const NetworkManagerDouble manager(value);
    const MeteredNetwork network(host);
    EXPECT_EQ(becomesMetered(network, expected ? Duration(ipc::kTestPatience) : 200ms), expected);
  }
  ::setenv("DBUS_SYSTEM_BUS_ADDRESS", "unix:path=/nonexistent/bus", 1);
  EXPECT_FALSE(MeteredNetwork(host).isMetered());
  ::unsetenv("DBUS_SYSTEM_BUS_ADDRESS");
}

}  // namespace
}  // namespace zelkord
