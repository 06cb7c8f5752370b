#include <gtest/gtest.h>
#include <stdlib.h>
#include <systemd/sd-bus.h>

#include <atomic>
#include <optional>

#include "platform/linux/ipc/IpcTestSupport.h"
#include "platform/linux/memory_pressure/LinuxMemoryPressure.h"
#include "platform/testing/ManualTimeline.h"
#include "platform/testing/RecordingLog.h"

namespace zelkord {
namespace {

TEST(LinuxMemoryPressureTest, SaysOnceThatNothingTellsAboutPressure) {
  ::setenv("DBUS_SYSTEM_BUS_ADDRESS", "unix:path=/nonexistent/bus", 1);
  RecordingLog log;
  ManualTimeline timeline;
  const auto queue = timeline.makeSerialQueue("test");
  Loop host("test-host");
  LinuxMemoryPressure pressure(host, log, "/nonexistent/pressure");
  for (int i = 0; i < 3; ++i) {
    auto subscription = pressure.onCritical(*queue, [] {});
    EXPECT_TRUE(subscription);
  }
  EXPECT_TRUE(ipc::eventually([&] { return log.entries().size() == 1; }));
  ::unsetenv("DBUS_SYSTEM_BUS_ADDRESS");
}

// A monitor of the bus of the moment warns until it is heard.
bool isHeard(const std::atomic<int>& warnings) {
  const auto before = warnings.load();
  const auto bus = openSystemBus(nullptr);
  ::sd_bus_request_name(bus.get(), "org.freedesktop.LowMemoryMonitor", 0);
  return ipc::eventually([&] {
    ::sd_bus_emit_signal(bus.get(), "/org/freedesktop/LowMemoryMonitor",
                         "org.freedesktop.LowMemoryMonitor", "LowMemoryWarning", "y", 255);
    ::sd_bus_flush(bus.get());
    return warnings > before;
  });
}

TEST(LinuxMemoryPressureTest, HearsAMonitorOfABusThatRestarts) {
  const ipc::IpcTestDirectory directory;
  std::optional<ipc::IpcTestBus> bus(directory.path());
  ::setenv("DBUS_SYSTEM_BUS_ADDRESS", bus->address().c_str(), 1);
  std::atomic<int> warnings = 0;
  std::atomic<int> missing = 0;
  Loop host("test-host");
  const auto watch = watchLowMemoryMonitor(
      host, [&] { ++warnings; }, [&] { ++missing; });
  EXPECT_TRUE(isHeard(warnings));
  bus->stop();
  EXPECT_TRUE(ipc::eventually([&] { return missing == 1; }));
  bus.emplace(directory.path());
  EXPECT_TRUE(isHeard(warnings));
  ::unsetenv("DBUS_SYSTEM_BUS_ADDRESS");
}

TEST(LinuxMemoryPressureTest, ASubscriptionMayOutliveTheService) {
  RecordingLog log;
  ManualTimeline timeline;
  const auto queue = timeline.makeSerialQueue("test");
  Loop host("test-host");
  auto pressure = std::make_unique<LinuxMemoryPressure>(host, log);
  auto subscription = pressure->onCritical(*queue, [] {});
  pressure.reset();
  subscription.reset();
  EXPECT_FALSE(subscription);
}

}  // namespace
}  // namespace zelkord
