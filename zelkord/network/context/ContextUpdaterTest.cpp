#include <gmock/gmock.h>

#include <map>

#include "zelkord/assembly/NotificationNames.h"
#include "zelkord/network/context/ContextUpdater.h"
#include "zelkord/network/context/VisibilityRestrictions.h"
#include "zelkord/network/context/ZelkorUserGUIDController.h"
#include "zelkord/network/request/RequestFactoryTestSupport.h"

namespace zelkord {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::Not;

class ContextUpdaterTest : public testing::Test {
 protected:
  void countRefreshes() {
    observer_ = world_.fake.notificationCenter.observe(
        std::string(kZLKBagRefreshRequired), [this](const Notification&) { ++refreshes_; },
        static_cast<const BagRequests*>(&world_.factory()));
  }
  std::string searchURL() { return world_.request("search")->url; }
  std::string headerOf(std::string_view kind, std::string_view name) {
    return world_.request(kind)->header(name).value_or("");
  }

  FactoryWorld world_;
  int refreshes_ = 0;
  Subscription observer_;
};

TEST_F(ContextUpdaterTest, FollowsEveryChangeThatTheHostAnnounces) {
  struct Case {
    std::string_view notification;
    std::function<void(FakePlatform&)> change;
    std::string before, after;  // part of the search's URL
    int refreshes;
  };
  const Case cases[] = {
      {kCountryCodeChanged, [](auto& f) { f.maps.country = "FR"; }, "cc=DE", "cc=FR", 1},
      {kCurrentLocaleChanged, [](auto& f) { f.locale.snapshot.identifier = "fr_FR"; },
       "locale=de_DE", "locale=fr_FR", 1},
      {kTimeZoneChanged, [](auto& f) { f.locale.zone = "Asia/Tokyo"; }, "time_zone=Europe/Berlin",
       "time_zone=Asia/Tokyo", 0},
      {kAccountStoreChanged, [](auto& f) { f.accounts.managed = true; }, "", "mode=managed", 0},
      {kAccountCredentialsChanged, [](auto& f) { f.accounts.managed = true; }, "", "mode=managed",
       0},
      {kEffectiveRestrictionsChanged, [](auto& f) { f.management.appInstallation = false; }, "",
       "mode=managed", 0},
  };
  for (const auto& [notification, change, before, after, refreshes] : cases) {
    SCOPED_TRACE(notification);
    FactoryWorld world;
    world.fake.accounts.managed = false;
    world.start();
    int posted = 0;
    const auto observer = world.fake.notificationCenter.observe(
        std::string(kZLKBagRefreshRequired), [&](const Notification&) { ++posted; });
    const auto generation = world.factory().contextGeneration();
    change(world.fake);
    EXPECT_THAT(world.request("search")->url, HasSubstr(before));
    EXPECT_THAT(world.request("search")->url, Not(HasSubstr(after)));
    world.notify(notification);
    EXPECT_THAT(world.request("search")->url, HasSubstr(after));
    EXPECT_EQ(posted, refreshes);
    if (refreshes > 0) {
      EXPECT_GT(world.factory().contextGeneration(), generation);
    }
  }
}

TEST_F(ContextUpdaterTest, FollowsMapsMetadata) {
  world_.start();
  world_.fake.maps.metadata = "bmV3";
  world_.notify(kMapsClientMetadataInvalidated);
  EXPECT_EQ(headerOf("search", "X-Quenta-GeoMetadata"), "bmV3");
}

TEST_F(ContextUpdaterTest, AsksForTheBagOnceForChangesThatComeTogetherAndNeverAtStart) {
  int atStart = 0;
  const auto early = world_.fake.notificationCenter.observe(
      std::string(kZLKBagRefreshRequired), [&](const Notification&) { ++atStart; });
  world_.start();
  EXPECT_EQ(atStart, 0);
  countRefreshes();
  world_.fake.maps.country = "FR";
  world_.fake.locale.snapshot.identifier = "fr_FR";
  world_.fake.notificationCenter.post(std::string(kCountryCodeChanged));
  world_.fake.notificationCenter.post(std::string(kCurrentLocaleChanged));
  EXPECT_EQ(refreshes_, 0) << "posted on the main queue, not at once";
  world_.fake.timeline.runUntilIdle();
  EXPECT_EQ(refreshes_, 1);
  world_.notify(kCountryCodeChanged);
  EXPECT_EQ(refreshes_, 2);
}

TEST_F(ContextUpdaterTest, TheBagIsFetchedForAllThatChangedTogether) {
  const std::string_view both[] = {kCountryCodeChanged, kCurrentLocaleChanged};
  for (const int first : {0, 1}) {
    SCOPED_TRACE(both[first]);
    FactoryWorld world;
    world.start();
    auto& controller = *world.assembly.bagController();
    controller.start();
    controller.currentBag();
    auto& session = *world.fake.urlSessions.find("bagSession");
    session.pending().at(0)->succeed(200, "{}");
    world.fake.timeline.runUntilIdle();

    // The main queue is faster than whoever posts.
    world.fake.timeline.letMainRunAtOnce();
    world.fake.maps.country = "FR";
    world.fake.locale.snapshot.identifier = "fr_FR";
    world.fake.locale.zone = "Europe/Paris";
    world.fake.notificationCenter.post(std::string(both[first]));
    EXPECT_THAT(world.request("search")->url, HasSubstr("time_zone=Europe/Paris"));
    world.fake.notificationCenter.post(std::string(both[1 - first]));
    world.fake.timeline.runUntilIdle();
    ASSERT_EQ(session.pending().size(), 1u);
    const auto url = session.pending()[0]->request().url;
    EXPECT_THAT(url, HasSubstr("cc=FR"));
    EXPECT_THAT(url, HasSubstr("locale=fr_FR"));
  }
}

TEST_F(ContextUpdaterTest, TheBagCacheURLFollowsAtOnce) {
  world_.start();
  world_.fake.maps.country = "cn";
  world_.fake.notificationCenter.post(std::string(kCountryCodeChanged));
  EXPECT_THAT(world_.request("bagCache")->url, HasSubstr("https://api-cn.zelkor.example/bag?"));
}

TEST_F(ContextUpdaterTest, LanguagesThatCannotBeEncodedAreLeftOut) {
  world_.start();
  world_.fake.locale.snapshot.preferredLanguages = {"de", "\xff"};
  world_.notify(kCurrentLocaleChanged);
  EXPECT_EQ(headerOf("search", "X-Quenta-Languages"), "");
  EXPECT_TRUE(world_.fake.log.contains("Error encoding preferred languages "));
}

TEST_F(ContextUpdaterTest, LogsWhatChangesAboutTheDevicesManagement) {
  world_.start();
  EXPECT_EQ(world_.fake.log.count("updating managed account status to: 1"), 1);
  world_.fake.log.clear();
  world_.fake.management.mediaStore = false;
  world_.notify(kEffectiveRestrictionsChanged);
  world_.notify(kEffectiveRestrictionsChanged);
  world_.notify(kAccountStoreChanged);
  EXPECT_THAT(world_.fake.log.texts("Zelkor_Request"),
              ElementsAre("device restriction have changed, currently restriction status is 0",
                          "updating device restriction status to: 1",
                          "device restriction have changed, currently restriction status is 1"));
}

TEST(DeviceRestrictionTest, TheStoresDecide) {
  struct Case {
    RestrictionValue bookStore;
    bool mediaStore, installation, restricted;
  };
  using enum RestrictionValue;
  const Case cases[] = {
      {Unset, true, true, false}, {Yes, true, true, false}, {No, true, true, true},
      {Unset, true, false, true}, {Yes, false, true, true}, {Yes, false, false, true},
  };
  for (const auto& [bookStore, mediaStore, installation, restricted] : cases) {
    FakeManagement management;
    management.bookStore = bookStore;
    management.mediaStore = mediaStore;
    management.appInstallation = installation;
    EXPECT_EQ(deviceIsRestricted(management), restricted)
        << static_cast<int>(bookStore) << mediaStore << installation;
  }
}

TEST_F(ContextUpdaterTest, ReadsDebugParametersOnceAtStart) {
  struct Case {
    std::string setting;
    std::vector<std::string> logged;
    std::string inURL;
  };
  const Case cases[] = {
      {"", {"processing debug parameters: ((null))"}, ""},
      {"d1=1&d2=2", {"processing debug parameters: (d1=1&d2=2)"}, "d1=1&d2=2"},
      {"d1=1&d2", {"processing debug parameters: (d1=1&d2)", "invalid query components: d2"}, ""},
  };
  for (const auto& [setting, logged, inURL] : cases) {
    SCOPED_TRACE(setting);
    FactoryWorld world;
    world.fake.log.setShowsPrivateData(true);
    world.fake.settings.set("ZLKDebugParameters", json::value(json::string(setting)));
    world.start();
    for (const auto& line : logged) EXPECT_TRUE(world.fake.log.contains(line)) << line;
    EXPECT_EQ(world.fake.log.count("invalid query components"), logged.size() > 1 ? 1 : 0);
    const auto url = world.request("bagCache")->url;
    EXPECT_THAT(url, HasSubstr(inURL));
    EXPECT_EQ(url.find("d1=") != std::string::npos, !inURL.empty());
  }
}

TEST_F(ContextUpdaterTest, ASubscriptionListThatCannotBeEncodedClearsTheHeader) {
  world_.start();
  EXPECT_EQ(headerOf("search", "X-Quenta-Subscriptions"), R"([{"provider":"acme","tier":2}])");
  world_.factory().didUpdateSubscriptionDictionaries({{{"provider", "\xff"}}});
  EXPECT_EQ(headerOf("search", "X-Quenta-Subscriptions"), "");
}

TEST_F(ContextUpdaterTest, TheMapsSessionRotatesWithTheUserIdentifier) {
  world_.start();
  EXPECT_EQ(headerOf("search", "X-Quenta-GeoSession"), "session-0");
  EXPECT_EQ(world_.fake.maps.resets, 0) << "requests do not reset it";
  world_.notify(kZLKUserGUIDChangeNotification);
  EXPECT_EQ(headerOf("search", "X-Quenta-GeoSession"), "session-1");
  EXPECT_EQ(world_.factory().getMapsUserSessionEntityAndReset(false)->sessionEntityString(),
            "session-1");
}

// The session that a search under the identifier carries.
class MapsSessionTest : public ContextUpdaterTest {
 protected:
  MapsSessionTest() { world_.start(); }
  std::string sessionUnder(const UUID& identifier) {
    world_.userGuid = identifier;
    return headerOf("search", "X-Quenta-GeoSession");
  }
  std::string toldUnder(const UUID& identifier) {
    const auto session = world_.factory().getMapsUserSessionEntityAndReset(false, identifier);
    return session->sessionEntityString().value_or("");
  }
  void announce() { world_.fake.timeline.runUntilIdle(); }

  ZelkorUserGUIDController guids_{world_.assembly};
};

TEST_F(MapsSessionTest, BelongsToOneIdentifierAlsoBeforeAChangeIsAnnounced) {
  const auto first = guids_.currentUserGUID();
  EXPECT_EQ(sessionUnder(first), "session-0");
  world_.fake.timeline.advance(900s);
  const auto second = guids_.currentUserGUID();
  EXPECT_EQ(sessionUnder(second), "session-1");
  EXPECT_EQ(sessionUnder(first), "session-0");
  EXPECT_EQ(toldUnder(first), "session-0");
  announce();
  EXPECT_EQ(sessionUnder(second), "session-1");
  EXPECT_EQ(toldUnder(first), "session-1");
  EXPECT_EQ(world_.fake.maps.resets, 1) << "once a change";

  guids_.reset();
  announce();
  EXPECT_EQ(world_.fake.maps.resets, 2);
  EXPECT_EQ(sessionUnder(first), "") << "it has ended";
  EXPECT_EQ(sessionUnder(second), "") << "it was held while another thread began a new one";
  EXPECT_EQ(sessionUnder(guids_.currentUserGUID()), "session-2");
  EXPECT_EQ(world_.fake.maps.resets, 2);
}

TEST_F(MapsSessionTest, IdentifiersOfSeveralClientsKeepTheirOwn) {
  ZelkorUserGUIDController others(world_.assembly);
  const auto mine = guids_.currentUserGUID();
  const auto another = others.currentUserGUID();
  for (int i = 0; i < 2; ++i) {
    EXPECT_EQ(sessionUnder(mine), "session-0");
    EXPECT_EQ(sessionUnder(another), "session-1");
    EXPECT_EQ(toldUnder(mine), "session-0");
  }
  guids_.reset();
  announce();
  EXPECT_EQ(sessionUnder(another), "session-1") << "only the other one has changed";
  EXPECT_EQ(sessionUnder(guids_.currentUserGUID()), "session-2");
  world_.fake.maps.session = "given";
  EXPECT_EQ(sessionUnder(guids_.currentUserGUID()), "given") << "as the device says";
}

TEST_F(MapsSessionTest, IsNeverSharedByHoweverManyIdentifiers) {
  std::map<std::string, UUID> holders;
  for (int round = 0; round < 2; ++round) {
    for (std::uint8_t i = 0; i < 150; ++i) {
      for (const UUID& user : {UUID{{1, i}}, UUID{{2, i}}}) {
        EXPECT_EQ(holders.try_emplace(sessionUnder(user), user).first->second, user);
      }
    }
  }
}

TEST_F(ContextUpdaterTest, AMapsSessionWithoutIdentifierIsLogged) {
  world_.fake.maps.session = std::optional<std::string>();
  world_.start();
  world_.request("search");
  EXPECT_THAT(world_.fake.log.texts("Zelkor_Request"),
              testing::Contains("GEOUserSessionEntity does not respond to selector "
                                "sessionIDString, actual class is MapsUserSession"));
}

TEST_F(ContextUpdaterTest, ABagSetsTheProxyAndTheRestrictions) {
  world_.setBag("agents", {{"news", {{"enabled", false}}}});
  world_.start();
  const auto& proxies = world_.fake.networkProxy.configurations();
  ASSERT_TRUE(proxies.contains("zelkord"));
  EXPECT_EQ(proxies.at("zelkord").at("proxy"), "https://proxy.example:443");
  EXPECT_EQ(world_.fake.management.applied().at("com.quenta.news"),
            (json::object{{"allow_news_results", false}}));
  EXPECT_TRUE(world_.fake.log.contains("set effective visibility restriction for <private> to "));
  world_.fake.management.failure = posixError(5);
  world_.bag = std::make_shared<ZLKBag>(nullptr, std::nullopt);
  world_.postBag();
  EXPECT_TRUE(world_.fake.networkProxy.configurations().empty());
  EXPECT_EQ(world_.fake.log.count("error setting MC restrictions: "), 2);
}

TEST_F(ContextUpdaterTest, RestrictionsHoldATransactionUntilTheyAreApplied) {
  world_.startWithoutBag();
  world_.fake.notificationCenter.post(
      {std::string(kZLKBagChangeNotification), nullptr, {{"bag", world_.bag}}});
  EXPECT_THAT(world_.fake.transactions.openNames(), ElementsAre("updateMC"));
  EXPECT_EQ(world_.fake.management.applications(), 0);
  world_.fake.timeline.runUntilIdle();
  EXPECT_THAT(world_.fake.transactions.openNames(), ElementsAre());
  EXPECT_EQ(world_.fake.management.applications(), 2);
}

TEST(VisibilityRestrictionsTest, FollowWhatTheBagSaysToEachAgent) {
  struct Case {
    json::object bag;
    bool news;
    json::array blocked;
  };
  const json::array blockedAll = {"com.quenta.messages.hashtagimages"};
  const Case cases[] = {
      {{}, true, {}},
      {{{"enabled", false}}, false, blockedAll},
      {{{"agents", {{"news", {{"enabled", false}}}}}}, false, {}},
      {{{"enabled", false}, {"agents", {{"messages", {{"enabled", true}}}}}}, false, {}},
  };
  for (const auto& [bag, news, blocked] : cases) {
    SCOPED_TRACE(json::serialize(bag));
    const auto restrictions =
        visibilityRestrictionsOf(ZLKBag(std::make_shared<const json::object>(bag), "lanthe"));
    ASSERT_EQ(restrictions.size(), 2u);
    EXPECT_EQ(restrictions[0].clientType, "com.quenta.news");
    EXPECT_EQ(restrictions[0].settings, (json::object{{"allow_news_results", news}}));
    EXPECT_EQ(restrictions[1].clientType, "com.quenta.messages.hashtagimages");
    EXPECT_EQ(restrictions[1].settings,
              (json::object{{"blocked_app_bundle_identifiers", blocked}}));
  }
}

}  // namespace
}  // namespace zelkord
