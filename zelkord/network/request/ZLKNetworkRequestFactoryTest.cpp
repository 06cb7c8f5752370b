#include <gtest/gtest.h>

#include "zelkord/network/exchange/URLComponents.h"
#include "zelkord/network/request/RequestFactoryTestSupport.h"
#include "zelkord/network/request/ZLKNetworkRequestFactory.h"

namespace zelkord {
namespace {

using Items = std::vector<QueryItem>;

// The decoded value of the item; none when the request does not have it.
std::optional<std::string> itemOf(const std::optional<URLRequest>& request, std::string_view name) {
  const auto url = URLComponents::parse(request.value_or(URLRequest{}).url);
  if (!url) return std::nullopt;
  for (const auto& item : url->queryItems) {
    if (item.name == name) return item.value.value_or("");
  }
  return std::nullopt;
}

class RequestFactoryTest : public testing::Test {
 protected:
  FactoryWorld world_;
};

TEST_F(RequestFactoryTest, ForcedItemsWinByTheOrderInWhichTheyAreAdded) {
  struct Case {
    std::string_view kind;
    Items client;
    std::string debug;
    std::string_view item;
    std::optional<std::string> value;
  };
  const Case cases[] = {
      {"search", {}, "", "q", "typed"},
      {"search", {{"q", "client"}}, "", "q", "client"},
      {"search", {{"q", "client"}, {"q", "later"}}, "", "q", "later"},
      {"search", {{"q", "client"}}, "q=debug", "q", "debug"},
      {"search", {{"qtype", "x"}}, "", "qtype", "x"},
      {"zeroKeyword", {{"qtype", "x"}}, "", "qtype", "x"},
      {"search", {}, "", "locale", "de_DE"},
      {"search", {{"locale", "client"}}, "", "locale", "client"},
      {"card", {{"locale", "client"}}, "locale=debug", "locale", "debug"},
      {"lookup", {{"Locale", "client"}}, "", "locale", "de_DE"},
      {"search", {{"v", "9"}}, "", "v", "9"},  // the URL's own is 2
      {"search", {{"card", "0"}}, "", "card", "0"},
      {"bagFetch", {{"key", "client"}}, "", "key", "harbor4817"},
      {"bagFetch", {}, "key=debug", "key", "debug"},  // though added after the key
      {"bagFetch", {}, "version=debug", "version", "debug"},
      {"bagCache", {}, "version=debug", "version", "debug"},
      {"flusherUpload", {}, "key=debug", "key", "debug"},
      {"fileDownload", {}, "key=debug", "key", "harbor4817"},
  };
  for (const auto& test : cases) {
    SCOPED_TRACE(std::string(test.kind) + " " + std::string(test.item) + " " + test.debug);
    FactoryWorld world;
    world.fake.settings.set("ZLKDebugParameters", json::value(json::string(test.debug)));
    world.eachQuery([&](ZLKRequest& query) {
      query.queryString = "typed";
      query.queryItems = test.client;
    });
    world.start();
    EXPECT_EQ(itemOf(world.request(test.kind), test.item), test.value);
  }
}

TEST_F(RequestFactoryTest, AMoreResultsURLKeepsItsOwnItems) {
  world_.moreResults.moreResultsURL = "https://s.example/m?latlng=1,2&locale=own&token=a%2Fb";
  world_.start();
  const auto request = world_.request("moreResults");
  EXPECT_EQ(itemOf(request, "latlng"), "1,2");
  EXPECT_EQ(itemOf(request, "locale"), "own");
  EXPECT_EQ(itemOf(request, "token"), "a/b");
}

TEST_F(RequestFactoryTest, NamesTheKindOfALookup) {
  world_.start();
  const std::pair<std::uint32_t, std::string_view> cases[] = {
      {0, "default"}, {1, "explicit"}, {2, "hint"}, {3, "default"}, {5, "default"}};
  for (const auto& [type, name] : cases) {
    world_.lookup.lookupSelectionType = type;
    EXPECT_EQ(itemOf(world_.request("lookup"), "ltype"), name) << type;
  }
}

TEST_F(RequestFactoryTest, SuggestionsAreMarkedByTheirTriggerEvent) {
  world_.start();
  for (std::uint32_t event = 0; event < 20; ++event) {
    world_.search.triggerEvent = event;
    EXPECT_EQ(itemOf(world_.request("search"), "qtype").has_value(), event == 8 || event == 10)
        << event;
  }
}

TEST_F(RequestFactoryTest, HeadersHoldNothingThatBreaksThem) {
  world_.start();
  EXPECT_FALSE(world_.factory()
                   .fileDownloadRequest("https://f.example/", "a\r\nX: y", true)
                   ->header("If-None-Match"));
  for (const std::string topics : {"", "[", "[] []", "{'a':1}"}) {
    world_.search.topics = topics;
    EXPECT_FALSE(world_.request("search")->header("X-Quenta-TopTopics")) << topics;
  }
  world_.search.topics = "[\"line\\nbreak\"]";
  EXPECT_EQ(world_.request("search")->header("X-Quenta-TopTopics"), "[\"line\\nbreak\"]");
}

TEST_F(RequestFactoryTest, NoUsableURLGivesNoRequest) {
  world_.start();
  for (const std::string url : {"", "no url", "https://"}) {
    SCOPED_TRACE(url);
    world_.setBag("search_url", json::value(json::string(url)));
    world_.setBag("more_results_url", json::value(json::string(url)));
    for (const auto kind : {"search", "zeroKeyword", "lookup", "moreResults"}) {
      EXPECT_FALSE(world_.request(kind)) << kind;
    }
    EXPECT_FALSE(world_.factory().fileDownloadRequest(url, "", false));
    EXPECT_FALSE(world_.factory().flusherUploadRequest(url, 1s, ""));
  }
}

TEST_F(RequestFactoryTest, OptionalVersionsAndAgentsAreLeftOut) {
  world_.start();
  auto& factory = world_.factory();
  const auto& controller = *world_.assembly.bagController();
  const auto cache = factory.bagCacheRequest(controller, std::nullopt, "");
  EXPECT_EQ(cache.url, "https://api.zelkor.example/bag?cc=DE&esl=de&locale=de_DE&morvane=1");
  EXPECT_TRUE(cache.headers.empty());
  EXPECT_FALSE(itemOf(factory.bagFetchRequest(controller, "A/1", std::nullopt), "version"));
  EXPECT_FALSE(
      factory.fileDownloadRequest("https://f.example/", "", true)->header("If-None-Match"));
}

TEST_F(RequestFactoryTest, ABuildSeesAllOfAnUpdateOrNothing) {
  world_.start();
  world_.fake.locale.snapshot.identifier = "fr_FR";
  world_.fake.locale.snapshot.effectiveSystemLanguage = "fr";
  EXPECT_EQ(itemOf(world_.request("search"), "locale"), "de_DE") << "not read for a request";
  world_.notify(kCurrentLocaleChanged);
  EXPECT_EQ(itemOf(world_.request("search"), "locale"), "fr_FR");
  EXPECT_EQ(itemOf(world_.request("search"), "esl"), "fr");
}

TEST_F(RequestFactoryTest, ABagIsDueAsSoonAsAChangeOfItsURLIsAnnounced) {
  world_.start();
  auto& controller = *world_.assembly.bagController();
  controller.cacheBagState(
      std::make_shared<const ZLKBag>(controller.cacheBagDictionary({}), std::nullopt),
      BagOrigin::Network);
  controller.cachedBagState();
  EXPECT_FALSE(world_.fake.log.contains("bag url changed from"));
  world_.fake.maps.country = "CN";
  world_.fake.notificationCenter.post(std::string(kCountryCodeChanged));
  controller.cachedBagState();  // the change itself is still on its way
  EXPECT_TRUE(world_.fake.log.contains("bag url changed from"));
}

}  // namespace
}  // namespace zelkord
