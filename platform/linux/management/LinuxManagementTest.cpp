#include <gmock/gmock.h>

#include "platform/linux/management/LinuxManagement.h"
#include "platform/testing/FakeFileManager.h"
#include "platform/testing/RecordingLog.h"

namespace zelkord {
namespace {

class LinuxManagementTest : public testing::Test {
 protected:
  FakeFileManager files_;
  RecordingLog log_;
  NotificationCenter center_;
  DeviceProfileStore store_{center_, "de_DE"};
};

TEST_F(LinuxManagementTest, VisibilityRestrictionsAreKeptByClientType) {
  const std::string path = "/state/restrictions.json";
  LinuxManagement management(store_, files_, log_);
  EXPECT_EQ(management.setVisibilityRestrictions("news", {{"allow", false}}), std::nullopt);
  EXPECT_EQ(management.setVisibilityRestrictions("images", {{"blocked", {"a"}}}), std::nullopt);
  EXPECT_EQ(management.setVisibilityRestrictions("news", {{"allow", true}}), std::nullopt);
  EXPECT_EQ(parseJson(*files_.bytes(path)),
            parseJson(R"({"news": {"allow": true}, "images": {"blocked": ["a"]}})"));
  EXPECT_EQ(files_.mode(path), 0600u);

  EXPECT_EQ(management.setVisibilityRestrictions("news", {{"allow", true}}), std::nullopt);
  EXPECT_EQ(files_.writes(), 3) << "the same again is not written";
  files_.fail(FakeFileManager::Operation::Write, ENOSPC);
  EXPECT_EQ(management.setVisibilityRestrictions("news", {})->code, ENOSPC);
  files_.fail(FakeFileManager::Operation::Write, 0);
  files_.tear(path, 5);
  EXPECT_EQ(management.setVisibilityRestrictions("news", {}), std::nullopt);
  EXPECT_EQ(files_.bytes(path), R"({"news":{}})");
  EXPECT_EQ(log_.count(LogLevel::Error), 1);
}

}  // namespace
}  // namespace zelkord
