#include <gmock/gmock.h>

#include "platform/linux/account/LinuxAccounts.h"
#include "platform/linux/locale/LinuxLocale.h"
#include "platform/linux/management/LinuxManagement.h"
#include "platform/linux/maps/LinuxMaps.h"
#include "platform/linux/proxy/LinuxNetworkProxy.h"
#include "platform/linux/proxy/ProxyRules.h"
#include "platform/linux/tagger/LinuxTagger.h"
#include "platform/linux/text_input/LinuxTextInput.h"
#include "platform/testing/FakeFileManager.h"
#include "platform/testing/RecordingLog.h"
#include "platform/testing/SeededRandom.h"

namespace zelkord {
namespace {

using testing::ElementsAre;

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

TEST_F(ProfileServicesTest, AMapsSessionLastsUntilItsReset) {
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

TEST_F(ProfileServicesTest, VisibilityRestrictionsAreKeptByClientType) {
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

TEST_F(ProfileServicesTest, TheProxyNeedsTheProfileAndAConfiguration) {
  LinuxNetworkProxy proxy(store_, log_);
  const json::object good{{"proxy", "http://127.0.0.1:8080"}, {"hosts", {"A.example", 5, "b c"}}};
  proxy.setConfiguration(&good, "zelkord");
  EXPECT_FALSE(proxy.isEnabled());
  DeviceProfile profile;
  profile.networkProxyEnabled = true;
  store_.replace(profile);
  ASSERT_TRUE(proxy.isEnabled());
  EXPECT_THAT(proxy.proxyConfiguration()->hosts, ElementsAre("a.example"));
  const json::object bad{{"proxy", "ftp://h:1"}, {"hosts", {"a"}}};
  proxy.setConfiguration(&bad, "zelkord");
  EXPECT_FALSE(proxy.isEnabled());
  EXPECT_EQ(log_.count(LogLevel::Error), 1);
  proxy.setConfiguration(&good, "zelkord");
  proxy.setConfiguration(nullptr, "zelkord");
  EXPECT_EQ(proxy.proxyConfiguration(), nullptr);
}

TEST(ProxyRulesTest, WantAProxyWithAPort) {
  const std::pair<const char*, bool> cases[] = {
      {"http://h:1", true},
      {"https://proxy.example:65535/", true},
      {"http://[::1]:80", true},
      {"http://h", false},
      {"http://h:0", false},
      {"http://h:65536", false},
      {"http://:80", false},
      {"socks5://h:80", false},
      {"http://u:p@h:80", false},
      {"http://h:80/path", false},
      {"h:80", false},
      {"http://[::1:80", false},
      {"http://h:8 0", false},
      {"", false},
  };
  for (const auto& [proxy, isGood] : cases) {
    SCOPED_TRACE(proxy);
    std::string problem;
    const auto parsed = parseProxyConfiguration({{"proxy", proxy}, {"hosts", {"a"}}}, &problem);
    EXPECT_EQ(parsed != nullptr, isGood) << problem;
  }
}

std::string repeated(const std::string& text, int times) {
  std::string all;
  for (int i = 0; i < times; ++i) all += text;
  return all;
}

TEST(LinuxTaggerTest, KnowsTheLanguageOfTheStart) {
  const std::string english = "The weather is nice today and we want to go out for a walk. ";
  const auto french = repeated(
      "Le chat dort sur la chaise pendant que les enfants jouent dans le jardin avec leurs amis. ",
      12);
  const auto german = repeated(
      "Der Hund schläft unter dem Tisch, während die Kinder mit ihren Freunden spielen. ", 12);
  const std::pair<std::string, const char*> cases[] = {
      {"Where can I find a good restaurant near the railway station tonight?", "en"},
      {"Wo finde ich heute Abend ein gutes Restaurant in der Nähe des Bahnhofs?", "de"},
      {"今日の夜、駅の近くで美味しいレストランを探しています。", "ja"},
      {"איפה אפשר למצוא מסעדה טובה ליד תחנת הרכבת הערב?", "he"},
      {english + french, "en"},
      {english + german, "en"},
      {"What is the time? " + french, "en"},
      {"The quick brown fox " + german, "en"},
      {"  \n\tPlease call me back. " + german, "en"},
      {"Où est la gare? " + repeated(english, 12), "fr"},
      {"Погода в Москве сегодня. " + repeated(english, 12), "ru"},
      {"東京の天気 " + repeated(english, 12), "ja"},
      {"\U0001F600 " + english + french, "en"},
      {french + english, "fr"},
      {"Paris. " + french, "fr"},
      {"42 " + german, "de"},
      {repeated("今日の夜、駅の近くで美味しいレストランを探しています。", 20), "ja"},
      {"where is it", "en"},
      {"Bonjour le monde", "fr"},
      {"안녕하세요", "ko"},
      {"สวัสดี", "th"},
      {"x", "und"},
      {"\U0001F600", "und"},
      {"", "und"},
      {"12345 67890", "und"},
      {"\xFF\xFE", "und"},
  };
  const LinuxTagger tagger;
  for (const auto& [text, language] : cases) {
    EXPECT_EQ(tagger.languageAtStart(text), language) << text.substr(0, 60);
  }
}

}  // namespace
}  // namespace zelkord
