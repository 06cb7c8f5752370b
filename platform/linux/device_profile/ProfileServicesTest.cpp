#include <gmock/gmock.h>

#include "platform/linux/account/LinuxAccounts.h"
#include "platform/linux/locale/LinuxLocale.h"
#include "platform/linux/management/LinuxManagement.h"
#include "platform/linux/maps/LinuxMaps.h"
#include "platform/linux/text_input/LinuxTextInput.h"
#include "platform/testing/FakeFileManager.h"
#include "platform/testing/RecordingLog.h"
#include "platform/testing/SeededRandom.h"

namespace zelkord {
namespace {

// What answers from the profile.
class ProfileServicesTest : public testing::Test {
 protected:
  FakeFileManager files_;
  RecordingLog log_;
  SeededRandom random_;
  NotificationCenter center_;
  DeviceProfileStore store_{center_, "de_DE"};
  LinuxLocale locale_{store_, {"de_DE", {}, "UTC"}, center_};
};

TEST_F(ProfileServicesTest, HaveDefaultsAndFollowTheProfile) {
  LinuxMaps maps(store_, locale_, random_);
  const LinuxAccounts accounts(store_);
  const LinuxManagement management(store_, files_, log_);
  const LinuxTextInput input(store_, locale_);
  EXPECT_EQ(maps.countryCode(), "DE");
  EXPECT_EQ(maps.clientMetadata(), std::nullopt);
  EXPECT_FALSE(accounts.primaryAccountIsManaged());
  EXPECT_EQ(management.bookStoreAllowed(), RestrictionValue::Unset);
  EXPECT_TRUE(management.mediaStoreAllowed());
  EXPECT_TRUE(management.appInstallationAllowed());
  EXPECT_EQ(management.diagnosticsSubmissionAllowed(), RestrictionValue::Unset);
  EXPECT_EQ(input.currentInputMode(), "de_DE");
  EXPECT_EQ(input.mainScreenScale(), 1.0);

  std::vector<std::string> problems;
  store_.replace(parseDeviceProfile(
      R"({"locale": "fr_FR", "managed_account": true, "book_store_allowed": 2, "media_store_allowed": false,
          "app_installation_allowed": false, "diagnostics_submission_allowed": false,
          "screen_scale": 3, "maps": {"metadata": "QUJD", "environment": "e"}})",
      problems));
  EXPECT_EQ(maps.countryCode(), "FR");
  EXPECT_EQ(maps.clientMetadata(), "QUJD");
  EXPECT_EQ(maps.environmentName(), "e");
  EXPECT_TRUE(accounts.primaryAccountIsManaged());
  EXPECT_EQ(management.bookStoreAllowed(), RestrictionValue::No);
  EXPECT_FALSE(management.mediaStoreAllowed());
  EXPECT_FALSE(management.appInstallationAllowed());
  EXPECT_EQ(management.diagnosticsSubmissionAllowed(), RestrictionValue::No);
  EXPECT_EQ(input.currentInputMode(), "fr_FR");
  EXPECT_EQ(input.mainScreenScale(), 3.0);
}

}  // namespace
}  // namespace zelkord
