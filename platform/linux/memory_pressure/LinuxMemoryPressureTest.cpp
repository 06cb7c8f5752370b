#include <gtest/gtest.h>
#include <stdlib.h>

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
  LinuxMemoryPressure pressure(log, "/nonexistent/pressure");
  for (int i = 0; i < 3; ++i) {
    auto subscription = pressure.onCritical(*queue, [] {});
    EXPECT_TRUE(subscription);
  }
  EXPECT_EQ(log.entries().size(), 1u);
}

TEST(LinuxMemoryPressureTest, ASubscriptionMayOutliveTheService) {
  RecordingLog log;
  ManualTimeline timeline;
  const auto queue = timeline.makeSerialQueue("test");
  auto pressure = std::make_unique<LinuxMemoryPressure>(log);
  auto subscription = pressure->onCritical(*queue, [] {});
  pressure.reset();
  subscription.reset();
  EXPECT_FALSE(subscription);
}

}  // namespace
}  // namespace zelkord
