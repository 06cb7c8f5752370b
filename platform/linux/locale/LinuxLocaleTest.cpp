#include <gmock/gmock.h>

#include "platform/linux/locale/HostLocaleWatcher.h"
#include "platform/linux/locale/LinuxLocale.h"
#include "platform/linux/locale/LocaleFacts.h"
#include "platform/linux/locale_text/LocaleText.h"
#include "platform/testing/TemporaryDirectory.h"

namespace zelkord {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;

TEST(LocaleTextTest, NormalisesIdentifiersAndTags) {
  struct Case {
    const char* text;
    std::optional<std::string> identifier;
    std::optional<std::string> tag;
  };
  const Case cases[] = {
      {"en_US.UTF-8", "en_US", "en-US"},
      {"de_DE.ISO-8859-1@euro", "de_DE", "de-DE"},
      {"sr-Latn-RS", "sr_Latn_RS", "sr-Latn-RS"},
      {"PT-br", "pt_BR", "pt-BR"},
      {"iw", "he", "he"},
      {"th_TH@calendar=buddhist", "th_TH@calendar=buddhist", "th-TH-u-ca-buddhist"},
      {"de-DE-u-ca-buddhist", "de_DE@calendar=buddhist", "de-DE-u-ca-buddhist"},
      {"C", {}, {}},
      {"C.UTF-8", {}, {}},
      {"POSIX", {}, {}},
      {"", {}, {}},
      {"_US", {}, {}},
      {"e", {}, {}},
      {"en US", {}, {}},
  };
  for (const auto& test : cases) {
    SCOPED_TRACE(test.text);
    EXPECT_EQ(localeIdentifierOf(test.text), test.identifier);
    EXPECT_EQ(languageTagOf(test.text), test.tag);
  }
}

TEST(LocaleFactsTest, FollowTheRegion) {
  struct Case {
    const char* locale;
    const char* calendar;
    const char* system;
    const char* temperature;
    bool is24Hour;
    const char* region;
  };
  const Case cases[] = {
      {"en_US", "gregorian", "U.S.", "Fahrenheit", false, "US"},
      {"en_GB", "gregorian", "U.K.", "Celsius", true, "GB"},
      {"de_DE", "gregorian", "Metric", "Celsius", true, "DE"},
      {"th_TH", "buddhist", "Metric", "Celsius", true, "TH"},
      {"fa_IR", "persian", "Metric", "Celsius", false, "IR"},
      {"en_BS", "gregorian", "Metric", "Fahrenheit", false, "BS"},
      {"ja", "gregorian", "Metric", "Celsius", false, "JP"},
      {"de_DE@calendar=buddhist", "buddhist", "Metric", "Celsius", true, "DE"},
  };
  for (const auto& test : cases) {
    SCOPED_TRACE(test.locale);
    HostLocale host;
    host.locale = test.locale;
    const auto facts = localeFacts({}, host);
    EXPECT_EQ(facts.identifier, test.locale);
    EXPECT_EQ(facts.calendar, test.calendar);
    EXPECT_EQ(facts.measurementSystem, test.system);
    EXPECT_EQ(facts.temperatureUnit, test.temperature);
    EXPECT_EQ(facts.preferredTemperatureUnit, "");
    EXPECT_EQ(facts.hourFormat.find("HH") != std::string::npos, test.is24Hour) << facts.hourFormat;
    EXPECT_EQ(regionOfLocale(test.locale), test.region);
  }
}

TEST(LocaleFactsTest, MatchLanguages) {
  struct Case {
    std::vector<std::string> preferred;
    std::vector<std::string> system;
    const char* effective;
  };
  const Case cases[] = {
      {{"de-AT", "en"}, {"en", "de"}, "de"}, {{"zh-TW"}, {"en", "zh-Hans", "zh-Hant"}, "zh-Hant"},
      {{"pt-PT"}, {"en", "pt-BR"}, "pt-BR"}, {{"ja"}, {"fr", "de"}, "fr"},
      {{"ja", "de"}, {"fr", "de"}, "de"},    {{"it", "fr"}, {}, "it"},
  };
  for (const auto& test : cases) {
    SCOPED_TRACE(test.effective);
    DeviceProfile profile;
    profile.preferredLanguages = test.preferred;
    profile.systemLanguages = test.system;
    EXPECT_EQ(localeFacts(profile, {}).effectiveSystemLanguage, test.effective);
  }
  DeviceProfile german;
  german.locale = "de_CH";
  EXPECT_THAT(localeFacts(german, {}).preferredLanguages, ElementsAre("de-CH"));
  HostLocale french;
  french.languages = {"fr", "en"};
  EXPECT_THAT(localeFacts(german, french).preferredLanguages, ElementsAre("fr", "en"));
}

TEST(HostLocaleTest, ReadsTheEnvironmentInItsOrder) {
  struct Case {
    std::map<std::string, std::string> variables;
    const char* locale;
    std::vector<std::string> languages;
  };
  const Case cases[] = {
      {{}, "en_US", {}},
      {{{"LANG", "de_DE.UTF-8"}}, "de_DE", {}},
      {{{"LANG", "de_DE.UTF-8"}, {"LC_MESSAGES", "fr_FR"}}, "fr_FR", {}},
      {{{"LANG", "de_DE"}, {"LC_MESSAGES", "fr_FR"}, {"LC_ALL", "C"}}, "en_US", {}},
      {{{"LANG", "C.UTF-8"}, {"LANGUAGE", "pt_BR:C:en"}}, "en_US", {"pt-BR", "en"}},
      {{{"LANG", "not a locale"}}, "en_US", {}},
  };
  for (const auto& test : cases) {
    SCOPED_TRACE(test.locale);
    HostLocaleSources sources;
    sources.environment = [&](const std::string& name) {
      const auto found = test.variables.find(name);
      return found == test.variables.end() ? std::string() : found->second;
    };
    const auto host = readHostLocale(sources);
    EXPECT_EQ(host.locale, test.locale);
    EXPECT_EQ(host.languages, test.languages);
  }
}

TEST(HostLocaleTest, FindsTheTimeZoneInItsPlaces) {
  const TemporaryDirectory root;
  std::string variable;
  HostLocaleSources sources;
  sources.environment = [&](const std::string& name) { return name == "TZ" ? variable : ""; };
  sources.localtimePath = root / "localtime";
  sources.timezonePath = root / "timezone";
  EXPECT_EQ(readHostLocale(sources).timeZone, "UTC");
  root.write("timezone", "Europe/Paris \n");
  EXPECT_EQ(readHostLocale(sources).timeZone, "Europe/Paris");
  std::filesystem::create_symlink("../usr/share/zoneinfo/Asia/Tokyo", root / "localtime");
  EXPECT_EQ(readHostLocale(sources).timeZone, "Asia/Tokyo");
  for (const char* text : {":America/New_York", "/usr/share/zoneinfo/posix/America/New_York"}) {
    variable = text;
    EXPECT_EQ(readHostLocale(sources).timeZone, "America/New_York");
  }
  variable = "../../etc/passwd";
  EXPECT_EQ(readHostLocale(sources).timeZone, "Asia/Tokyo");
}

TEST(HostLocaleTest, TakesTheSystemsVariables) {
  EXPECT_EQ(localeVariables({"LANG=de_DE.UTF-8", "LC_TIME=x", "LANGUAGE=de:en=", "broken"}),
            (std::map<std::string, std::string>{{"LANG", "de_DE.UTF-8"}, {"LANGUAGE", "de:en="}}));
}

TEST(LinuxLocaleTest, AnnouncesWhatTheHostChanges) {
  NotificationCenter center;
  DeviceProfileStore store(center, "en_US");
  LinuxLocale locale(store, {"en_US", {}, "UTC"}, center);
  std::vector<std::string> posted;
  std::vector<Subscription> observers;
  for (const auto name : {kCountryCodeChanged, kTimeZoneChanged, kCurrentLocaleChanged}) {
    observers.push_back(center.observe(std::string(name), [&](const Notification& notification) {
      posted.push_back(notification.name);
    }));
  }
  locale.hostChanged({"en_US", {}, "Asia/Tokyo"});
  EXPECT_THAT(posted, ElementsAre(kTimeZoneChanged));
  EXPECT_EQ(locale.timeZoneName(), "Asia/Tokyo");

  posted.clear();
  locale.hostChanged({"de_DE", {}, "Asia/Tokyo"});
  EXPECT_THAT(posted, ElementsAre(kCountryCodeChanged, kCurrentLocaleChanged));

  posted.clear();
  DeviceProfile profile;
  profile.locale = "fr_FR";
  profile.timeZone = "Europe/Paris";
  store.replace(profile);
  EXPECT_EQ(locale.current().identifier, "fr_FR");
  EXPECT_EQ(locale.timeZoneName(), "Europe/Paris");
  posted.clear();
  locale.hostChanged({"it_IT", {"it"}, "Europe/Rome"});
  EXPECT_THAT(posted, ElementsAre(kCurrentLocaleChanged));
}

TEST(LinuxLocaleTest, TheCountryIsThatOfTheHostsLocaleOfTheMoment) {
  struct Case {
    const char* host;
    std::optional<std::string> locale, country;  // of the profile
    int changes;
  };
  const Case cases[] = {
      {"de_DE", {}, {}, 1},      {"de_DE", {}, "DE", 0}, {"de_DE", "en_US", {}, 1},
      {"fr_FR", "en_US", {}, 0}, {"fr_FR", {}, {}, 1},   {"it_FR", {}, {}, 0},
      {"it_IT", {}, "IT", 1},    {"de_DE", {}, "IT", 0}, {"de_DE", {}, {}, 1},
      {"de_DE", {}, "DE", 0},
  };
  NotificationCenter center;
  DeviceProfileStore store(center, "en_US");
  LinuxLocale locale(store, {"en_US", {}, "UTC"}, center);
  int changes = 0;
  const auto observer =
      center.observe(std::string(kCountryCodeChanged), [&](const Notification&) { ++changes; });
  for (const auto& test : cases) {
    SCOPED_TRACE(std::string(test.host) + test.locale.value_or("-") + test.country.value_or("-"));
    changes = 0;
    locale.hostChanged({test.host, {}, "UTC"});
    DeviceProfile profile;
    profile.locale = test.locale;
    profile.country = test.country;
    store.replace(profile);
    EXPECT_EQ(changes, test.changes);
  }
}

}  // namespace
}  // namespace zelkord
