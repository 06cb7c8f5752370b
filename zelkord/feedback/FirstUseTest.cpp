#include <gtest/gtest.h>

#include "zelkord/feedback/FirstUse.h"
#include "zelkord/feedback/SessionsTestSupport.h"

namespace zelkord {
namespace {

TEST(FirstUseTest, TheLastSupportedClientInTheAgentGivesTheKey) {
  const std::vector<std::pair<std::optional<std::string>, std::optional<std::string>>> cases = {
      {std::nullopt, std::nullopt},
      {"", std::nullopt},
      {"Other/1", std::nullopt},
      {"BRELIN/1", "ZelkorFirstUseOfTheDay_brelin"},
      {"Brelin/1 with news", "ZelkorFirstUseOfTheDay_news"},
      {"news, then brelin", "ZelkorFirstUseOfTheDay_news"},
      {"vocari lookup messages", "ZelkorFirstUseOfTheDay_vocari"},
  };
  for (const auto& [agent, key] : cases) {
    EXPECT_EQ(FirstUse::_getUserDefaultKey(agent), key) << agent.value_or("none");
  }
}

class FirstUseOfTheDayTest : public testing::Test {
 protected:
  FirstUseOfTheDayTest() { bed_.fakes.locale.zone = "Europe/Berlin"; }
  // The start of a session at that time (UTC).
  bool startsAt(const char* time, const std::optional<std::string>& agent = "Lanthe/9") {
    std::tm date{};
    ::strptime(time, "%Y-%m-%d %H:%M", &date);
    bed_.fakes.timeline.setWall(wallTimeOfSeconds(static_cast<double>(::timegm(&date))));
    FirstUse use(bed_.assembly, agent);
    return use._firstUseOfTheDay(agent);
  }
  std::int64_t activeDays(const std::string& name) {
    return bed_.counter("com.quenta.zelkord." + name + ".dailyactiveusers");
  }

  SessionsBed bed_;
};

TEST_F(FirstUseOfTheDayTest, ComparesTheDayOfTheMonthWhereTheUserIs) {
  EXPECT_TRUE(startsAt("2026-11-22 12:00"));
  EXPECT_EQ(bed_.fakes.settings.flushes(), 1);
  EXPECT_FALSE(startsAt("2026-11-22 22:59"));
  EXPECT_TRUE(startsAt("2026-11-22 23:01"));   // the 23rd in Berlin
  EXPECT_FALSE(startsAt("2026-12-23 12:00"));  // the same day of another month
  EXPECT_TRUE(startsAt("2025-01-01 12:00"));   // a clock that jumped back
  EXPECT_EQ(activeDays("lanthe"), 3);
}

TEST_F(FirstUseOfTheDayTest, IsKeptForEachClient) {
  EXPECT_TRUE(startsAt("2026-11-22 12:00", "Lanthe/9"));
  EXPECT_TRUE(startsAt("2026-11-22 12:00", "Brelin/1"));
  EXPECT_FALSE(startsAt("2026-11-22 13:00", "Lanthe/10"));
  EXPECT_FALSE(startsAt("2026-11-22 12:00", "Other/1"));  // has no key
  EXPECT_FALSE(startsAt("2026-11-22 12:00", std::nullopt));
  EXPECT_EQ(activeDays("lanthe"), 1);
  EXPECT_EQ(activeDays("brelin"), 1);
  EXPECT_TRUE(bed_.fakes.settings.value("ZelkorFirstUseOfTheDay_brelin")->at("$date").is_double());
}

TEST_F(FirstUseOfTheDayTest, AnOddSettingCountsAsNone) {
  for (const auto& odd : {json::value(7), json::value("x"), json::value(json::object())}) {
    bed_.fakes.settings.set("ZelkorFirstUseOfTheDay_lanthe", odd);
    EXPECT_TRUE(startsAt("2026-11-22 12:00"));
  }
}

}  // namespace
}  // namespace zelkord
