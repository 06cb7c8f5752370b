#include <gmock/gmock.h>

#include <cerrno>

#include "platform/linux/LinuxPlatform.h"
#include "platform/testing/TemporaryDirectory.h"

namespace zelkord {
namespace {

using testing::HasSubstr;

class LinuxPlatformTest : public testing::Test {
 protected:
  LinuxPlatformTest() {
    options_.usesSessionBus = false;
    options_.logFile = root_ / "log";
    options_.environment.environment =
        [this](const std::string& name) -> std::optional<std::string> {
      if (name == "XDG_CONFIG_DIRS") return root_ / "etc";
      if (name.starts_with("XDG_")) return root_ / name;
      return std::nullopt;
    };
  }

  const TemporaryDirectory root_;
  LinuxPlatformOptions options_;
  Error error_;
};

TEST_F(LinuxPlatformTest, ServicesKeepWhatTheyAreToldOverARestart) {
  root_.write("etc/com.quenta.zelkord/defaults.json", R"({"ZLKLogPrivateData": true})");
  root_.write("XDG_CONFIG_HOME/com.quenta.zelkord/device.json", R"({"country": "JP"})");
  {
    const auto host = LinuxPlatform::make(options_, &error_);
    ASSERT_TRUE(host) << error_.description();
    auto& platform = host->platform();
    EXPECT_EQ(platform.maps.countryCode(), "JP");
    platform.settings.set("key", "value");
    platform.counters.add("counter", 3);
    Logger(platform.log, "C").error("typed {}", priv("text"));
  }
  EXPECT_THAT(root_.read("log"), HasSubstr("Z error C typed text\n"));
  EXPECT_THAT(root_.read("XDG_RUNTIME_DIR/com.quenta.zelkord/metrics.prom"),
              HasSubstr("{key=\"counter\"} 3"));
  const auto host = LinuxPlatform::make(options_, &error_);
  ASSERT_TRUE(host);
  EXPECT_EQ(host->platform().settings.value("key"), json::value("value"));
  EXPECT_EQ(host->platform().counters.all().at("counter"), 3);
}

TEST_F(LinuxPlatformTest, TwoDoNotShareAStateDirectory) {
  const auto first = LinuxPlatform::make(options_, &error_);
  ASSERT_TRUE(first);
  EXPECT_EQ(LinuxPlatform::make(options_, &error_), nullptr);
  EXPECT_EQ(error_.code, EWOULDBLOCK);
  EXPECT_THAT(*error_.reason(), HasSubstr("already running"));
}

TEST_F(LinuxPlatformTest, SaysWhyWhenThereIsNoPlaceForItsState) {
  root_.write("XDG_STATE_HOME", "a file");
  EXPECT_EQ(LinuxPlatform::make(options_, &error_), nullptr);
  EXPECT_THAT(*error_.reason(), HasSubstr("XDG_STATE_HOME/com.quenta.zelkord"));
}

}  // namespace
}  // namespace zelkord
