#include <gtest/gtest.h>

#include "zelkord/network/context/LocationController.h"
#include "zelkord/network/request/RequestFactoryTestSupport.h"

namespace zelkord {
namespace {

const std::string kBundle(kLocationBundlePath);

// Drives the location through the requests that tell it.
class LocationControllerTest : public testing::Test {
 protected:
  LocationControllerTest() { world_.fixType.reset(); }

  // The value of the item in a request that asks for no fix.
  std::string told(std::string_view name) {
    const auto url = world_.request("card")->url;
    const auto at = url.find("&" + std::string(name) + "=");
    if (at == std::string::npos) return "";
    const auto begin = at + name.size() + 2;
    return url.substr(begin, url.find('&', begin) - begin);
  }
  std::string downloadsPlace() {
    return world_.request("fileDownload")->header("X-Quenta-FuzzedLatLong").value_or("");
  }
  void run() { world_.fake.timeline.runUntilIdle(); }

  FactoryWorld world_;
  FakeLocation& location_ = world_.fake.location;
};

TEST_F(LocationControllerTest, BeginsWithAReasonByTheAuthorizationAndTheBag) {
  struct Case {
    LocationAuthorization before, after;
    std::string atStart;
    json::array sources;
    std::string withBag;
    int managers, updating;
  };
  const Case cases[] = {
      {0, 4, "userno", {"gps"}, "userno", 1, 1},
      {1, 1, "userno", {"gps"}, "userno", 1, 0},
      {2, 2, "userno", {"gps"}, "userno", 1, 0},
      {3, 3, "error.init", {"gps"}, "error.init", 1, 1},
      {4, 4, "error.init", {"gps"}, "error.init", 1, 1},
      {4, 4, "error.init", {}, "bagno.all", 0, 0},
  };
  for (const auto& test : cases) {
    SCOPED_TRACE(std::to_string(test.before) + test.withBag);
    FactoryWorld world;
    world.fixType.reset();
    world.fake.location.setAuthorization(kBundle, test.before);
    world.setBag("supported_geo_location_sources", test.sources);
    world.startWithoutBag();
    EXPECT_EQ(world.fake.location.authorization(kBundle), test.after);
    const auto tells = [&](const std::string& reason) {
      return world.request("card")->url.find("geosrc=" + reason + "&") != std::string::npos;
    };
    EXPECT_TRUE(tells(test.atStart));
    world.postBag();
    EXPECT_TRUE(tells(test.withBag));
    EXPECT_EQ(world.fake.location.managers(), test.managers);
    EXPECT_EQ(world.fake.location.updating(), test.updating);
  }
}

TEST_F(LocationControllerTest, AsksForCoarseFixes) {
  world_.start();
  ASSERT_EQ(location_.options().size(), 1u);
  EXPECT_EQ(location_.options()[0].desiredAccuracy, 1000);
  EXPECT_TRUE(location_.options()[0].dynamicAccuracyReduction);
}

TEST_F(LocationControllerTest, OnlyTheFirstBagSetsItUp) {
  world_.setBag("supported_geo_location_sources", json::array());
  world_.start();
  world_.setBag("supported_geo_location_sources", {"gps"});
  world_.postBag();
  EXPECT_EQ(location_.managers(), 0);
  EXPECT_EQ(told("geosrc"), "bagno.all");
}

TEST_F(LocationControllerTest, TakesOneFixAndRests) {
  world_.start();
  world_.deliverFix(1);
  EXPECT_EQ(told("latlng"), "37.774900,-122.419400");
  EXPECT_EQ(told("geosrc"), "gps,65.000000");
  EXPECT_EQ(location_.updating(), 0);
}

TEST_F(LocationControllerTest, TheLastFixOfSeveralCounts) {
  world_.start();
  location_.deliver({{.latitude = 1, .type = 1, .time = world_.fake.timeline.now()},
                     {.latitude = 2, .type = 4, .time = world_.fake.timeline.now()}});
  run();
  EXPECT_EQ(told("latlng"), "2.000000,0.000000");
  EXPECT_EQ(told("geosrc"), "wifi,0.000000");
}

TEST_F(LocationControllerTest, AForbiddenFixLeavesItLooking) {
  world_.start();
  world_.deliverFix(6);
  EXPECT_EQ(told("geosrc"), "bagno.cell");
  EXPECT_EQ(told("latlng"), "");
  EXPECT_EQ(location_.updating(), 1);
  world_.setBag("supported_geo_location_sources", {"cell"});
  world_.postBag();
  world_.deliverFix(6);
  EXPECT_EQ(told("geosrc"), "cell,65.000000");
}

TEST_F(LocationControllerTest, OnlySomeRequestsSayThatTheyDidNotWait) {
  struct Case {
    std::string_view kind;
    std::string moreResultsURL;
    bool asks;
  };
  const Case cases[] = {{"search", "", true},
                        {"zeroKeyword", "", true},
                        {"lookup", "", true},
                        {"moreResults", "", true},
                        {"moreResults", "https://service.example/more?latlng=1,2", false},
                        {"card", "", false},
                        {"bagFetch", "", false}};
  for (const auto& [kind, moreResultsURL, asks] : cases) {
    SCOPED_TRACE(std::string(kind) + moreResultsURL);
    FactoryWorld world;
    world.fixType.reset();
    world.moreResults.moreResultsURL = moreResultsURL;
    world.start();
    world.fieldMask = 1;  // asks all the same
    const int starts = world.fake.location.starts();
    world.request(kind);
    world.fake.timeline.runUntilIdle();
    EXPECT_EQ(world.fake.location.starts(), starts + (asks ? 1 : 0));
    const auto card = world.request("card")->url;
    EXPECT_EQ(card.find("geosrc=slow&") != std::string::npos, asks);
  }
}

TEST_F(LocationControllerTest, AFixIsAskedForAgainAfterFiveMinutes) {
  world_.start();
  world_.deliverFix(1);
  const int starts = location_.starts();
  world_.fake.timeline.advance(299s);
  world_.request("search");
  run();
  EXPECT_EQ(location_.starts(), starts);
  world_.fake.timeline.advance(1s);
  world_.request("search");
  run();
  EXPECT_EQ(location_.starts(), starts + 1);
  EXPECT_EQ(told("geosrc"), "gps,65.000000") << "the old one serves meanwhile";
  // Not by each of the requests that follow closely.
  for (const auto pause : {Duration(0s), Duration(500ms), Duration(500ms)}) {
    world_.fake.timeline.advance(pause);
    world_.request("search");
    run();
  }
  EXPECT_EQ(location_.starts(), starts + 2);
}

TEST_F(LocationControllerTest, FollowsTheUsersAuthorization) {
  world_.start();
  world_.deliverFix(1);
  location_.changeAuthorization(kBundle, 2);
  run();
  EXPECT_EQ(told("geosrc"), "userno");
  EXPECT_EQ(told("latlng"), "");
  EXPECT_EQ(downloadsPlace(), "");
  location_.changeAuthorization(kBundle, 3);
  run();
  EXPECT_EQ(location_.updating(), 1);
  world_.deliverFix(1);
  EXPECT_EQ(told("geosrc"), "gps,65.000000");
  location_.setEnabledSystemWide(false);
  location_.changeAuthorization(kBundle, 3);
  run();
  EXPECT_EQ(told("geosrc"), "userno");
}

TEST_F(LocationControllerTest, AFailureIsLoggedAndTold) {
  world_.start();
  location_.fail(urlError(URLErrorCode::Other));
  run();
  EXPECT_EQ(told("geosrc"), "error.fail");
  EXPECT_TRUE(world_.fake.log.contains("Location determination failed with error {"));
}

TEST_F(LocationControllerTest, DownloadsTellThePrecisePlaceOnlyAfterASearch) {
  world_.start();
  world_.deliverFix(1);
  EXPECT_EQ(downloadsPlace(), "37.000000,-122.000000");
  world_.factory().setPerformedSearch();
  EXPECT_EQ(downloadsPlace(), "37.774900,-122.419400");
}

TEST_F(LocationControllerTest, NeverTellsThePlaceInLogs) {
  world_.start();
  world_.deliverFix(1);
  world_.deliverFix(6);
  EXPECT_FALSE(world_.fake.log.contains("37.77"));
}

}  // namespace
}  // namespace zelkord
