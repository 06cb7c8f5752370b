#include <gmock/gmock.h>

#include "corezelkor/ZLKBag.h"

namespace zelkor {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

ZLKBag bagOf(std::string_view text, std::optional<std::string> userAgent = "Lanthe/3.1 (News)") {
  auto dictionary = std::make_shared<const json::object>(parseJson(text)->as_object());
  return {std::move(dictionary), std::move(userAgent)};
}

TEST(ZLKBagTest, OverridesOfTheAgentsTokensWinInTheOrderWritten) {
  struct Case {
    const char* agents;
    std::optional<std::string> userAgent;
    const char* searchURL;
  };
  const Case cases[] = {
      {R"({})", "Lanthe/3.1", "top"},
      {R"({"lanthe": {"search_url": "a"}})", "Lanthe/3.1", "a"},
      {R"({"lanthe": {"search_url": "a"}})", "Brelin/1", "top"},
      {R"({"lanthe": {"search_url": "a"}})", std::nullopt, "top"},
      {R"({"lanthe": {"search_url": "a"}})", "", "top"},
      {R"({"Lanthe": {"search_url": "a"}})", "Lanthe/3.1", "top"},
      {R"({"lanthe": {"search_url": "a"}, "news": {"search_url": "b"}})", "Lanthe/3 (News)", "b"},
      {R"({"news": {"search_url": "b"}, "lanthe": {"search_url": "a"}})", "Lanthe/3 (News)", "a"},
      {R"({"z": {"search_url": "z"}, "a": {"warm_url": "w"}})", "Az", "z"},
      {R"({"ß": {"search_url": "s"}})", "Groß", "s"},
      {R"({"lanthe": "a", "news": ["b"]})", "Lanthe/3 (News)", "top"},
      {R"(["lanthe"])", "Lanthe/3.1", "top"},
      {R"({"lanthe": {"agents": {"lanthe": {"search_url": "deep"}}}})", "Lanthe/3.1", "top"},
  };
  for (const auto& [agents, userAgent, searchURL] : cases) {
    SCOPED_TRACE(agents);
    const auto text = std::string(R"({"search_url": "top", "agents": )") + agents + "}";
    const auto bag = bagOf(text, userAgent);
    EXPECT_EQ(bag.searchURL(), searchURL);
    EXPECT_EQ(bag.userAgent(), userAgent);
    EXPECT_EQ(bag.rawBag()->at("search_url"), "top") << "without overrides";
  }
}

TEST(ZLKBagTest, AnOverrideOfTheWrongTypeLeavesTheValueBelow) {
  const auto bag = bagOf(R"({
    "version": "7", "enabled": false, "search_url": "top", "timeout_interval_for_request": 5,
    "supported_geo_location_sources": ["gps"], "resources": {"a": "b"}, "client_name": "c",
    "agents": {
      "lanthe": {"search_url": "middle", "timeout_interval_for_request": 7},
      "news": {"version": true, "enabled": 1, "search_url": 5, "timeout_interval_for_request": "9",
               "supported_geo_location_sources": "wifi", "resources": [], "client_name": null}}})");
  EXPECT_EQ(bag.version(), "7");
  EXPECT_FALSE(bag.isEnabled());
  EXPECT_EQ(bag.searchURL(), "middle");
  EXPECT_EQ(bag.timeoutIntervalForRequest(), 7s);
  EXPECT_THAT(bag.supportedGeoLocationSources(), ElementsAre("gps"));
  EXPECT_EQ(bag.resources()->at("a"), "b");
  EXPECT_EQ(bag.clientName(), "c");
}

TEST(ZLKBagTest, AnOverrideMayTakeAwayWhatStandsBelow) {
  const auto bag = bagOf(R"({
    "search_url": "top", "supported_geo_location_sources": ["gps"], "enabled": true,
    "image_identifiers": {"a": "a-url"}, "timeout_interval_for_request": 5,
    "agents": {"lanthe": {"search_url": "", "supported_geo_location_sources": [], "enabled": false,
                          "image_identifiers": {"b": "b-url"}, "timeout_interval_for_request": 0}}})");
  EXPECT_EQ(bag.searchURL(), std::nullopt);
  EXPECT_THAT(bag.supportedGeoLocationSources(), IsEmpty());
  EXPECT_FALSE(bag.isEnabled());
  EXPECT_EQ(bag.urlForIdentifier("a"), std::nullopt) << "replaced whole";
  EXPECT_EQ(bag.urlForIdentifier("b"), "b-url");
  EXPECT_EQ(bag.timeoutIntervalForRequest(), 30s);
}

TEST(ZLKBagTest, ReadsTimesAndLengths) {
  struct Case {
    const char* number;  // empty: absent
    Duration requestTimeout;
    std::optional<Duration> renderTimeout;  // the number is milliseconds there
    std::optional<Duration> subscriptionTTL;
    std::size_t minimumLength;
  };
  const Case cases[] = {
      {"", 30s, {}, {}, 1},
      {"0", 30s, 0s, 0s, 0},
      {"-3", 30s, -3ms, -3s, 0},
      {"2", 2s, 2ms, 2s, 2},
      {"2.5", 2500ms, 2500us, 2500ms, 2},
      {"\"2\"", 30s, {}, {}, 1},
      {"true", 30s, {}, {}, 1},
  };
  for (const auto& test : cases) {
    SCOPED_TRACE(test.number);
    std::string text = "{";
    if (*test.number) {
      for (const char* key : {"timeout_interval_for_request", "search_render_timeout",
                              "subscription_ttl", "minimum_query_length"}) {
        text += (text.size() > 1 ? ", \"" : "\"") + std::string(key) + "\": " + test.number;
      }
    }
    const auto bag = bagOf(text + "}");
    EXPECT_EQ(bag.timeoutIntervalForRequest(), test.requestTimeout);
    EXPECT_EQ(bag.searchRenderTimeout(), test.renderTimeout);
    EXPECT_EQ(bag.subscriptionTTL(), test.subscriptionTTL);
    EXPECT_EQ(bag.minimumQueryLength(), test.minimumLength);
  }
}

TEST(ZLKBagTest, ListsKeepTheirTextsOnly) {
  const auto bag = bagOf(R"({
    "supported_geo_location_sources": ["wifi", 1, null, "gps", ["cell"], "wifi"],
    "subscription_provider_bundle_identifier_whitelist": ["b", {}, "a", "b"],
    "subscription_provider_domain_whitelist": {"a": "b"}})");
  EXPECT_THAT(bag.supportedGeoLocationSources(), ElementsAre("gps", "wifi"));
  EXPECT_THAT(bag.subscriptionProviderBundleIdentifierWhitelist(), ElementsAre("b", "a", "b"));
  EXPECT_THAT(bag.subscriptionProviderDomainWhitelist(), IsEmpty());
}

TEST(ZLKBagTest, AVersionIsATextOrANumber) {
  const std::pair<const char*, std::optional<std::string>> cases[] = {
      {"\"1.2-b\"", "1.2-b"}, {"7", "7"},
      {"7.0", "7"},           {"0.25", "0.25"},
      {"1e3", "1000"},        {"-1", "-1"},
      {"\"\"", ""},           {"18446744073709551615", "18446744073709551615"},
      {"null", std::nullopt}, {"[1]", std::nullopt},
  };
  for (const auto& [value, version] : cases) {
    SCOPED_TRACE(value);
    EXPECT_EQ(bagOf(std::string(R"({"version": )") + value + "}").version(), version);
  }
}

TEST(ZLKBagTest, WithoutAnythingItIsOnAndSaysNothing) {
  for (const auto& bag : {ZLKBag(nullptr, "Lanthe/1"), bagOf("{}")}) {
    EXPECT_TRUE(bag.isEnabled());
    EXPECT_FALSE(bag.feedbackEnabled() || bag.lookupEnabled() || bag.sendGeoEnvironmentHeader());
    EXPECT_FALSE(bag.version() || bag.searchURL() || bag.warmURL() || bag.clientName());
    EXPECT_FALSE(bag.morvaneConfiguration() || bag.resources() || bag.urlForIdentifier(""));
  }
}

TEST(ZLKBagTest, ReadsEachURLUnderItsOwnKey) {
  const auto bag =
      bagOf(R"({"warm_url": "w", "search_url": "s", "more_results_url": "m", "card_url": "c",
                             "item_related_content_url": "i", "feedback_url": "f",
                             "crowdsourcing_url": "r"})");
  EXPECT_THAT((std::vector{bag.warmURL(), bag.searchURL(), bag.moreResultsURL(), bag.cardURL(),
                           bag.itemRelatedContentURL(), bag.feedbackURL(), bag.crowdsourcingURL()}),
              ElementsAre("w", "s", "m", "c", "i", "f", "r"));
}

}  // namespace
}  // namespace zelkor
