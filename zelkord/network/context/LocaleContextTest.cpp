#include <gtest/gtest.h>

#include "zelkord/network/context/LocaleContext.h"

namespace zelkord {
namespace {

TEST(LocaleContextTest, NamesTheMeasurementSystems) {
  const std::pair<std::string, std::string> cases[] = {
      {"Metric", "SI"}, {"U.S.", "US"}, {"U.K.", "UK"}, {"metric", ""}, {"", ""}};
  for (const auto& [system, units] : cases) {
    SCOPED_TRACE(system);
    EXPECT_EQ(localeContextOf({.measurementSystem = system}).measurementSystem, units);
  }
}

TEST(LocaleContextTest, TheUsersTemperatureUnitGoesBeforeTheLocales) {
  struct Case {
    std::string preferred, locales, letter;
  };
  const Case cases[] = {
      {"Celsius", "Fahrenheit", "C"}, {"", "Fahrenheit", "F"}, {"", "", ""}, {"Ölgrad", "", "Ö"}};
  for (const auto& [preferred, locales, letter] : cases) {
    SCOPED_TRACE(preferred + "/" + locales);
    const LocaleSnapshot locale{.temperatureUnit = locales, .preferredTemperatureUnit = preferred};
    EXPECT_EQ(localeContextOf(locale).tempUnits, letter);
  }
}

TEST(LocaleContextTest, KnowsA24HourFormatByItsPattern) {
  const std::pair<std::string, std::string> cases[] = {{"HH", "1"}, {"HH 'Uhr'", "1"}, {"H", ""},
                                                       {"h a", ""}, {"hh", ""},        {"", ""}};
  for (const auto& [pattern, flag] : cases) {
    SCOPED_TRACE(pattern);
    EXPECT_EQ(localeContextOf({.hourFormat = pattern}).is24hDateFormat, flag);
  }
}

TEST(LocaleContextTest, SendsAtMostThreeLanguages) {
  EXPECT_EQ(languagesHeader({}), "");
  EXPECT_EQ(languagesHeader({"de"}), R"(["de"])");
  EXPECT_EQ(languagesHeader({"de", "en-GB", "fr", "it", "es"}), R"(["de","en-GB","fr"])");
  EXPECT_EQ(languagesHeader({"de", "\xff"}), std::nullopt);
}

}  // namespace
}  // namespace zelkord
