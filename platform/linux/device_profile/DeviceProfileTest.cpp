#include <gmock/gmock.h>

#include "platform/api/NotificationCenter.h"
#include "platform/linux/device_profile/DeviceProfile.h"

namespace zelkord {
namespace {

using testing::ElementsAre;
using testing::ElementsAreArray;
using testing::IsEmpty;

DeviceProfile profileOf(const char* text, std::vector<std::string>* problems = nullptr) {
  std::vector<std::string> found;
  auto profile = parseDeviceProfile(text, found);
  if (problems) *problems = found;
  return profile;
}

TEST(DeviceProfileTest, ReadsEveryKey) {
  std::vector<std::string> problems;
  const auto profile = profileOf(R"({
    "product_type": "Phone1,2", "product_name": "Quenta OS", "build_version": "7A1",
    "locale": "de-DE", "preferred_languages": ["de", "en-us"], "system_languages": ["en"],
    "temperature_unit": "Fahrenheit", "time_zone": "Europe/Berlin", "country": "de",
    "keyboard_input_mode": "", "screen_scale": 2,
    "location": {"latitude": 1.5, "longitude": -2, "horizontal_accuracy": 500, "age": 3},
    "location_services_enabled": false, "location_authorization": 4.0, "managed_account": true,
    "book_store_allowed": 2, "media_store_allowed": false, "app_installation_allowed": false,
    "diagnostics_submission_allowed": true, "storefront": "143441", "news_account_status": 3,
    "network_proxy_enabled": true, "unknown": {},
    "subscriptions": {"z": {"domain": "z.example", "expires": 10, "plan": "x"},
                      "a": {"bundle_identifier": "a.app", "expires": 2e9}},
    "maps": {"session": "S", "metadata": "QUJD", "environment": "test"}})",
                                 &problems);
  EXPECT_THAT(problems, IsEmpty());
  EXPECT_EQ(profile.productType, "Phone1,2");
  EXPECT_EQ(profile.locale, "de_DE");
  EXPECT_THAT(profile.preferredLanguages, ElementsAre("de", "en-US"));
  EXPECT_EQ(profile.country, "DE");
  EXPECT_EQ(profile.keyboardInputMode, "");
  EXPECT_EQ(profile.screenScale, 2);
  EXPECT_EQ(profile.location, (DeviceProfile::Location{1.5, -2, 500, 4, 3}));
  EXPECT_EQ(profile.locationAuthorization, 4);
  EXPECT_EQ(profile.bookStoreAllowed, RestrictionValue::No);
  EXPECT_EQ(profile.diagnosticsSubmissionAllowed, RestrictionValue::Yes);
  EXPECT_EQ(profile.newsAccountStatus, 3);
  ASSERT_EQ(profile.subscriptions.size(), 2u);
  EXPECT_EQ(profile.subscriptions[0].bundleIdentifier, "a.app");
  EXPECT_EQ(profile.subscriptions[1].dictionary, (json::object{{"plan", "x"}}));
  EXPECT_EQ(profile.mapsMetadata, "QUJD");
}

TEST(DeviceProfileTest, AnUnusableValueIsAbsentAndNamed) {
  const char* const cases[] = {
      R"("product_type": "")",
      R"("product_name": "a\nb")",
      R"("build_version": 7)",
      R"("locale": "C")",
      R"("locale": "../../x")",
      R"("preferred_languages": "de")",
      R"("preferred_languages": ["de", 1])",
      R"("system_languages": [""])",
      R"("temperature_unit": "Kelvin")",
      R"("time_zone": "Mars/Base")",
      R"("country": "DEU")",
      R"("country": "D1")",
      R"("screen_scale": -1)",
      R"("location": {"latitude": 1})",
      R"("location": {"latitude": 91, "longitude": 0})",
      R"("location_authorization": 5)",
      R"("location_authorization": 1.5)",
      R"("location_services_enabled": 1)",
      R"("book_store_allowed": 3)",
      R"("media_store_allowed": "true")",
      R"("diagnostics_submission_allowed": "no")",
      R"("storefront": "a\u0085b")",
      R"("news_account_status": 1e300)",
      R"("subscriptions": [])",
      R"("subscriptions": {"a": {"domain": "a.example"}})",
      R"("subscriptions": {"a": {"expires": 1}})",
      R"("maps": 1)",
      R"("maps": {"metadata": "QUJ\nD"})",
      R"("maps": {"metadata": "QUJDR"})",
      R"("maps": {"session": 1})",
  };
  for (const char* text : cases) {
    SCOPED_TRACE(text);
    std::vector<std::string> problems;
    EXPECT_EQ(profileOf((std::string("{") + text + "}").c_str(), &problems), DeviceProfile());
    const std::string_view value = text;
    const auto key = std::string(value.substr(0, value.find('"', 1)));
    ASSERT_FALSE(problems.empty());
    EXPECT_THAT(problems.back(), testing::HasSubstr(key));
  }
}

TEST(DeviceProfileTest, ABadPartOfALocationOrASubscriptionLeavesTheRest) {
  std::vector<std::string> problems;
  const auto profile = profileOf(
      R"({"location": {"latitude": 1, "longitude": 2, "type": 10, "age": -1, "horizontal_accuracy": 5000},
          "subscriptions": {"bad": 1, "good": {"domain": "d", "expires": 1}}})",
      &problems);
  EXPECT_EQ(profile.location, (DeviceProfile::Location{1, 2, 5000, 6, 0}));
  EXPECT_EQ(profile.subscriptions.size(), 1u);
  EXPECT_EQ(problems.size(), 3u);
}

TEST(DeviceProfileTest, ATextThatIsNoObjectIsAnEmptyProfile) {
  for (const char* text : {"", "{", "[]", "1", "{\"locale\": \"de_DE\"} x", "\xFF"}) {
    SCOPED_TRACE(text);
    std::vector<std::string> problems;
    EXPECT_EQ(profileOf(text, &problems), DeviceProfile());
    EXPECT_EQ(problems.size(), 1u);
  }
}

TEST(ProfileChangesTest, AreAnnouncedByWhatTheyMean) {
  struct Case {
    const char* before;
    const char* after;
    std::vector<std::string_view> names;
  };
  const Case cases[] = {
      {"{}", "{}", {}},
      {"{}", R"({"product_type": "x", "screen_scale": 3, "network_proxy_enabled": true})", {}},
      {"{}", R"({"country": "US"})", {}},
      {"{}", R"({"country": "DE"})", {kCountryCodeChanged}},
      {"{}", R"({"locale": "en_GB"})", {kCountryCodeChanged, kCurrentLocaleChanged}},
      {R"({"country": "DE"})", R"({"country": "DE", "locale": "en_GB"})", {kCurrentLocaleChanged}},
      {"{}", R"({"temperature_unit": "Celsius"})", {kCurrentLocaleChanged}},
      {"{}", R"({"time_zone": "Asia/Tokyo"})", {kTimeZoneChanged}},
      {R"({"maps": {"metadata": "QUJD"}})", "{}", {kMapsClientMetadataInvalidated}},
      {"{}", R"({"maps": {"session": "x"}})", {}},
      {"{}", R"({"managed_account": true})", {kAccountStoreChanged}},
      {"{}", R"({"managed_account": false})", {}},
      {"{}", R"({"app_installation_allowed": false})", {kEffectiveRestrictionsChanged}},
      {"{}", R"({"storefront": "1"})", {kStorefrontChanged}},
      {"{}", R"({"news_account_status": 3})", {kNewsAccountStatusChanged}},
      {R"({"subscriptions": {"a": {"domain": "d", "expires": 1}}})",
       R"({"subscriptions": {"a": {"domain": "d", "expires": 2}}})",
       {kSubscriptionsChanged}},
  };
  for (const auto& test : cases) {
    SCOPED_TRACE(test.after);
    EXPECT_THAT(notificationsForChange(profileOf(test.before), profileOf(test.after), "en_US"),
                ElementsAreArray(test.names));
  }
}

}  // namespace
}  // namespace zelkord
