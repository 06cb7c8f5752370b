#include <gmock/gmock.h>

#include "platform/linux/locale/LinuxLocale.h"
#include "platform/linux/maps/LinuxMaps.h"
#include "platform/testing/SeededRandom.h"

namespace zelkord {
namespace {

class LinuxMapsTest : public testing::Test {
 protected:
  SeededRandom random_;
  NotificationCenter center_;
  DeviceProfileStore store_{center_, "de_DE"};
  LinuxLocale locale_{store_, {"de_DE", {}, "UTC"}, center_};
};

TEST_F(LinuxMapsTest, AMapsSessionLastsUntilItsReset) {
  LinuxMaps maps(store_, locale_, random_);
  const auto first = maps.userSession(false);
  EXPECT_EQ(maps.userSession(false), first);
  const auto second = maps.userSession(true);
  EXPECT_NE(second, first);
  EXPECT_EQ(maps.userSession(false), second);
  DeviceProfile profile;
  profile.mapsSession = "fixed";
  store_.replace(profile);
  EXPECT_EQ(maps.userSession(true), std::optional<std::string>("fixed"));
}

}  // namespace
}  // namespace zelkord
