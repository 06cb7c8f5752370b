#include <gtest/gtest.h>

#include "platform/testing/FakeDevice.h"
#include "zelkord/assembly/UserAgent.h"

namespace zelkord {
namespace {

TEST(UserAgentTest, PutsTheDeviceIntoTheSeed) {
  FakeDevice device;
  device.type = "T1,2";
  device.name = "Some OS";
  device.build = "7B";
  const std::pair<std::string_view, std::optional<std::string>> cases[] = {
      {"", std::nullopt},
      {"Lanthe/1", "Zelkord/1.0 (T1,2; Some OS 7B) Lanthe/1"},
      {"x Zelkord/1.0 (y", "x Zelkord/1.0 (y"},
      {"Zelkord/1.0", "Zelkord/1.0 (T1,2; Some OS 7B) Zelkord/1.0"},
  };
  for (const auto& [seed, expected] : cases) {
    EXPECT_EQ(createUserAgentString(seed, device), expected) << seed;
  }
  EXPECT_EQ(zelkordUserAgent(device), "Zelkord/1.0 (T1,2; Some OS 7B) Zelkord/1.0");
}

}  // namespace
}  // namespace zelkord
