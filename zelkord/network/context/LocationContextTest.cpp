#include <gtest/gtest.h>

#include "zelkord/network/context/LocationContext.h"

namespace zelkord {
namespace {

constexpr SteadyTime kFixTime{1000s};

LocationFix fixOfType(int type, double latitude = 37.7749, double longitude = -122.4194) {
  return {.latitude = latitude,
          .longitude = longitude,
          .horizontalAccuracy = 65,
          .type = type,
          .time = kFixTime};
}

TEST(LocationContextTest, NamesTheSourceOfEveryTypeOfFix) {
  const std::pair<int, std::string_view> cases[] = {
      {-1, "unknown"}, {0, "unknown"}, {1, "gps"},  {2, "gps"},  {3, "gps"}, {4, "wifi"},
      {5, "wifi"},     {6, "cell"},    {7, "cell"}, {8, "cell"}, {9, "gps"}, {10, "unknown"}};
  for (const auto& [type, source] : cases) {
    SCOPED_TRACE(type);
    EXPECT_EQ(locationSourceOfType(type), source);
  }
}

TEST(LocationContextTest, AFixTellsItsPlaceAndWholeDegreesForLookups) {
  struct Case {
    double latitude, longitude;
    std::string latLng, lookup;
  };
  const Case cases[] = {
      {37.7749, -122.4194, "37.774900,-122.419400", "37.000000,-122.000000"},
      {-0.5, 0.9, "-0.500000,0.900000", "0.000000,0.000000"},
      {-33.99999, 151.0, "-33.999990,151.000000", "-33.000000,151.000000"},
  };
  for (const auto& [latitude, longitude, latLng, lookup] : cases) {
    SCOPED_TRACE(latLng);
    LocationContext context{.supportedSources = {"wifi"}};
    EXPECT_TRUE(context.setLocationIfAllowedByBag(fixOfType(4, latitude, longitude)));
    EXPECT_EQ(context.latLng, latLng);
    EXPECT_EQ(context.source, "wifi,65.000000");
    EXPECT_EQ(context.lookupLatLng, lookup);
  }
}

TEST(LocationContextTest, AFixThatTheBagForbidsMakesTheLocationUnknown) {
  LocationContext context{.supportedSources = {"gps"}};
  ASSERT_TRUE(context.setLocationIfAllowedByBag(fixOfType(1)));
  EXPECT_FALSE(context.setLocationIfAllowedByBag(fixOfType(6)));
  EXPECT_FALSE(context.fix);
  EXPECT_EQ(context.latLng, "");
  EXPECT_EQ(context.lookupLatLng, "");
  EXPECT_EQ(context.source, "bagno.cell");
}

TEST(LocationContextTest, LookupsKeepTheirFirstPlaceUntilTheUserSearches) {
  LocationContext context{.supportedSources = {"gps"}};
  context.setPerformedSearch();  // nothing to be precise about
  EXPECT_EQ(context.lookupLatLng, "");
  context.setLocationIfAllowedByBag(fixOfType(1, 10.5, 20.5));
  context.setLocationIfAllowedByBag(fixOfType(1, 30.5, 40.5));
  EXPECT_EQ(context.lookupLatLng, "10.000000,20.000000");
  context.setPerformedSearch();
  EXPECT_EQ(context.lookupLatLng, "30.500000,40.500000");
  context.setLocationIfAllowedByBag(fixOfType(1, 50.5, 60.5));
  EXPECT_EQ(context.lookupLatLng, "30.500000,40.500000");
  context.setNoLocationWithReason(kLocationFailed);
  EXPECT_EQ(context.lookupLatLng, "");
  context.setLocationIfAllowedByBag(fixOfType(1, 50.5, 60.5));
  EXPECT_EQ(context.lookupLatLng, "50.000000,60.000000");
}

TEST(LocationContextTest, ARequestAsksForAFixUnlessThereIsAYoungOneOrNobodyToAsk) {
  struct Case {
    std::string_view name;
    bool hasManager;
    std::optional<Duration> age;  // of the fix
    std::string_view reason;      // without a fix
    LocationNeed need;
  };
  const Case cases[] = {
      {"no manager", false, {}, kNoFixYet, LocationNeed::Nothing},
      {"first fix outstanding", true, {}, kNoFixYet, LocationNeed::MarkSlowAndAsk},
      {"marked before", true, {}, kFixIsSlow, LocationNeed::Ask},
      {"refused by the user", true, {}, kUserSaidNo, LocationNeed::Ask},
      {"young fix", true, 299s, {}, LocationNeed::Nothing},
      {"old fix", true, 300s, {}, LocationNeed::Ask},
  };
  for (const auto& [name, hasManager, age, reason, need] : cases) {
    SCOPED_TRACE(name);
    LocationContext context{.hasManager = hasManager, .source = std::string(reason)};
    if (age) context.fix = fixOfType(1);
    EXPECT_EQ(context.need(kFixTime + age.value_or(0s)), need);
  }
}

}  // namespace
}  // namespace zelkord
