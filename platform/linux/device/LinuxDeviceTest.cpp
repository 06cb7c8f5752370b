#include <gmock/gmock.h>

#include "platform/linux/device/LinuxDevice.h"
#include "platform/linux/device/OsRelease.h"
#include "platform/testing/FakeFileManager.h"

namespace zelkord {
namespace {

TEST(LinuxDeviceTest, ProfileOverOsReleaseOverNothing) {
  FakeFileManager files;
  files.put("/usr/lib/os-release", "NAME=\"Old\"\nVERSION_ID=1\n");
  files.put("/etc/os-release", "NAME=\"Quenta \\\"OS\\\"\"\nVERSION_ID='12'\n");
  int asked = 0;
  LinuxDevice::Host host;
  host.hardwareModel = [&] { return ++asked == 1 ? "Board 3" : "bad\nmodel"; };

  const LinuxDevice found({}, host, files);
  EXPECT_EQ(found.productType(), "Board 3");
  EXPECT_EQ(found.productName(), "Quenta \"OS\"");
  EXPECT_EQ(found.buildVersion(), "12");
  EXPECT_EQ(LinuxDevice({}, host, files).productType(), "Linux");

  DeviceProfile profile;
  profile.productType = "Phone";
  profile.buildVersion = "7";
  files.put("/etc/os-release", "BUILD_ID=rolling");
  EXPECT_EQ(LinuxDevice(profile, host, files).productType(), "Phone");
  EXPECT_EQ(LinuxDevice(profile, host, files).buildVersion(), "7");
  EXPECT_EQ(LinuxDevice({}, host, files).buildVersion(), "rolling");
  EXPECT_EQ(asked, 3);
}

TEST(OsReleaseTest, ReadsShellAssignments) {
  const auto values = parseOsRelease(
      "# NAME=no\n\nA=plain\nB=\"quo\\\"ted\"\nC='si\\ngle'\nD=\nE=x\\ y \r\n=no\nno\nF=last");
  EXPECT_EQ(values, (std::map<std::string, std::string>{{"A", "plain"},
                                                        {"B", "quo\"ted"},
                                                        {"C", "si\\ngle"},
                                                        {"D", ""},
                                                        {"E", "x y"},
                                                        {"F", "last"}}));
}

}  // namespace
}  // namespace zelkord
