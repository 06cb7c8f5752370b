#include <gmock/gmock.h>

#include "corezelkor/ZLKBag.h"

namespace zelkor {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

ZLKBag bagOf(const char* text, std::optional<std::string> agent = std::nullopt) {
  return {std::make_shared<const json::object>(parseJson(text)->as_object()), std::move(agent)};
}

TEST(ZLKBagTest, TokensOfTheUserAgentOverrideInTheOrderWritten) {
  // "version" says which layers were read, "client_name" which of them has a say in it.
  constexpr const char* kAgents = R"({
    "version": "top", "client_name": "top", "search_url": "https://top/",
    "agents": {"news": {"version": "news"},
               "phone": {"version": "phone", "client_name": "phone"},
               "": {"search_url": "https://every/"},
               "MAC": {"version": "never"},
               "tablet": ["version", "no object"],
               "wrong": {"version": true, "search_url": 3, "client_name": null}}})";
  struct Case {
    std::optional<std::string> agent;
    const char* version;
    const char* name;
    const char* url;
  };
  const Case cases[] = {
      {std::nullopt, "top", "top", "https://top/"},
      {"", "top", "top", "https://every/"},
      {"NEWS/1.0", "news", "top", "https://every/"},
      {"Phone news/1.0", "phone", "phone", "https://every/"},
      {"newsphone", "phone", "phone", "https://every/"},
      {"Mac/1", "top", "top", "https://every/"},
      {"tablet/1", "top", "top", "https://every/"},
      {"wrong/1", "top", "top", "https://every/"},
      {"wrong news/1", "news", "top", "https://every/"},
  };
  for (const auto& test : cases) {
    SCOPED_TRACE(test.agent.value_or("none"));
    const auto bag = bagOf(kAgents, test.agent);
    EXPECT_EQ(bag.version(), test.version);
    EXPECT_EQ(bag.clientName(), test.name);
    EXPECT_EQ(bag.searchURL(), test.url);
  }
}

TEST(ZLKBagTest, AnOverrideReplacesAValueWhole) {
  const auto bag = bagOf(R"({"image_identifiers": {"a": "https://a/", "b": "https://b/"},
                             "supported_geo_location_sources": ["gps", "wifi"], "enabled": true,
                             "agents": {"x": {"image_identifiers": {"a": "https://x/"},
                                              "supported_geo_location_sources": [], "enabled": false}}})",
                         "x");
  EXPECT_EQ(bag.urlForIdentifier("a"), "https://x/");
  EXPECT_EQ(bag.urlForIdentifier("b"), std::nullopt);
  EXPECT_THAT(bag.supportedGeoLocationSources(), IsEmpty());
  EXPECT_FALSE(bag.isEnabled());
  EXPECT_TRUE(bag.rawBag()->at("enabled").as_bool());
}

TEST(ZLKBagTest, WhatIsAbsentOrOfAnotherTypeHasItsDefault) {
  constexpr const char* kCases[] = {
      "{}",
      R"({"version": true, "enabled": "no", "feedback_enabled": 1, "lookup_enabled": "yes",
          "search_url": "", "warm_url": 7, "minimum_query_length": "3", "search_render_timeout": [],
          "timeout_interval_for_request": "5", "send_geo_environment_header": 1,
          "supported_geo_location_sources": "gps", "image_identifiers": ["a"], "resources": [],
          "morvane_configuration": "x", "subscription_ttl": {}, "agents": [{"": {"enabled": false}}],
          "subscription_provider_bundle_identifier_whitelist": {"a": "b"}})",
      R"({"enabled": null, "image_identifiers": {"a": ""}, "supported_geo_location_sources": [1, null],
          "agents": {"": 3}})"};
  for (const char* text : kCases) {
    SCOPED_TRACE(text);
    const auto bag = bagOf(text, "agent");
    EXPECT_EQ(bag.version(), std::nullopt);
    EXPECT_TRUE(bag.isEnabled());
    EXPECT_FALSE(bag.feedbackEnabled() || bag.lookupEnabled() || bag.sendGeoEnvironmentHeader());
    EXPECT_FALSE(bag.searchURL() || bag.warmURL() || bag.urlForIdentifier("a"));
    EXPECT_EQ(bag.minimumQueryLength(), 1u);
    EXPECT_EQ(bag.timeoutIntervalForRequest(), 30s);
    EXPECT_FALSE(bag.searchRenderTimeout() || bag.subscriptionTTL());
    EXPECT_THAT(bag.supportedGeoLocationSources(), IsEmpty());
    EXPECT_THAT(bag.subscriptionProviderBundleIdentifierWhitelist(), IsEmpty());
    EXPECT_FALSE(bag.resources() || bag.morvaneConfiguration());
  }
  EXPECT_TRUE(ZLKBag(nullptr, "agent").isEnabled());
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

TEST(ZLKBagTest, ReadsNumbersInTheirUnits) {
  struct Case {
    const char* number;
    Duration request;
    Duration render;
    std::size_t length;
  };
  const Case cases[] = {
      {"0", 30s, 0s, 0},
      {"-1", 30s, -1ms, 0},
      {"0.5", 500ms, 500us, 0},
      {"12", 12s, 12ms, 12},
      {"2.5", 2500ms, 2500us, 2},
      {"1e3", 1000s, 1s, 1000},
      {"1e300", durationOfSeconds(1e300), durationOfSeconds(1e297), 1'000'000'000}};
  for (const auto& test : cases) {
    SCOPED_TRACE(test.number);
    const std::string number = test.number;
    const auto bag = bagOf(("{\"timeout_interval_for_request\": " + number +
                            ", \"search_render_timeout\": " + number +
                            ", \"minimum_query_length\": " + number + "}")
                               .c_str());
    EXPECT_EQ(bag.timeoutIntervalForRequest(), test.request);
    EXPECT_EQ(bag.searchRenderTimeout(), test.render);
    EXPECT_EQ(bag.minimumQueryLength(), test.length);
  }
}

TEST(ZLKBagTest, AVersionIsATextHoweverItIsWritten) {
  const std::pair<const char*, const char*> cases[] = {
      {"\"12\"", "12"}, {"12", "12"}, {"12.0", "12"}, {"1.5", "1.5"}, {"\"\"", ""}, {"-3", "-3"}};
  for (const auto& [written, text] : cases) {
    SCOPED_TRACE(written);
    EXPECT_EQ(bagOf(("{\"version\": " + std::string(written) + "}").c_str()).version(), text);
  }
}

TEST(ZLKBagTest, ListsKeepTheirTextsInOrder) {
  const auto bag =
      bagOf(R"({"subscription_provider_bundle_identifier_whitelist": ["b", 1, "a", null, "b"],
                             "subscription_provider_domain_whitelist": ["d"], "subscription_ttl": 60,
                             "supported_geo_location_sources": ["wifi", "gps", "wifi", 7]})");
  EXPECT_THAT(bag.subscriptionProviderBundleIdentifierWhitelist(), ElementsAre("b", "a", "b"));
  EXPECT_THAT(bag.subscriptionProviderDomainWhitelist(), ElementsAre("d"));
  EXPECT_THAT(bag.supportedGeoLocationSources(), ElementsAre("gps", "wifi"));
  EXPECT_EQ(bag.subscriptionTTL(), Duration(60s));
}

}  // namespace
}  // namespace zelkor
