#include <gtest/gtest.h>

#include <boost/json/parse.hpp>
#include <boost/json/serialize.hpp>

#include "sandbox/service/Bag.h"

namespace sandbox {

namespace {

namespace json = boost::json;

constexpr const char* kBase = "https://localhost:1";

json::value bagFor(const Bag& bag, std::vector<QueryItem> items) {
  Request request;
  request.items = std::move(items);
  return json::parse(bag.answer(request).bodyText());
}

}  // namespace

TEST(BagTest, MergesAsTheStandardHasIt) {
  struct Case {
    const char* target;
    const char* patch;
    const char* result;
  };
  for (const auto& [target, patch, result] : std::initializer_list<Case>{
           {R"({"a":"b"})", R"({"a":"c","b":1})", R"({"a":"c","b":1})"},
           {R"({"a":"b","c":1,"d":2})", R"({"a":null})", R"({"c":1,"d":2})"},
           {R"({"a":{"b":1}})", R"({"a":{"b":null,"c":{"d":null}}})", R"({"a":{"c":{}}})"},
           {R"({"a":["b"]})", R"({"a":{"b":"c"}})", R"({"a":{"b":"c"}})"},
           {R"({"a":1})", R"([2])", R"([2])"}}) {
    SCOPED_TRACE(patch);
    json::value merged = json::parse(target);
    mergePatch(merged, json::parse(patch));
    EXPECT_EQ(json::serialize(merged), result);
  }
}

TEST(BagTest, NamesThisServerForEverything) {
  const Bag bag(kBase);
  const auto document = bagFor(bag, {{"cc", "DE"}, {"version", "3"}});
  for (const char* key : {"search_url", "more_results_url", "card_url", "warm_url", "feedback_url",
                          "crowdsourcing_url", "item_related_content_url"}) {
    EXPECT_TRUE(std::string_view(document.at(key).get_string()).starts_with(kBase)) << key;
  }
  for (const auto& name : document.at("download_resources_list").get_array()) {
    EXPECT_TRUE(document.get_object().contains(name.get_string())) << name;
  }
  EXPECT_EQ(document.at("version"), "12");
  EXPECT_EQ(document.at("served_for").at("version"), "3");
  EXPECT_EQ(document.at("supported_geo_location_sources").get_array().size(), 3U);
  EXPECT_EQ(bagFor(bag, {{"cc", "cn"}}).at("supported_geo_location_sources").get_array().size(),
            2U);
}

TEST(BagTest, AnswersAndAnnouncesWhatControlPatched) {
  Bag bag(kBase);
  EXPECT_EQ(bag.announcement(), R"({"bag": 12})");
  bag.patch(json::parse(R"({"version":13,"card_url":null,"agents":{"news":{"enabled":false}}})"));
  bag.patch(json::parse(R"({"agents":{"messages":null}})"));
  EXPECT_EQ(bag.announcement(), R"({"bag": 13})");
  const auto document = bagFor(bag, {});
  EXPECT_FALSE(document.get_object().contains("card_url"));
  EXPECT_EQ(json::serialize(document.at("agents")), R"({"news":{"enabled":false}})");
  bag.patch(json::parse(R"({"version":"echo"})"));
  EXPECT_FALSE(bag.announcement());
  EXPECT_EQ(bagFor(bag, {{"version", "99"}}).at("version"), "99");
  EXPECT_EQ(bagFor(bag, {}).at("version"), "12");
  bag.reset();
  EXPECT_TRUE(bagFor(bag, {}).get_object().contains("card_url"));
}

}  // namespace sandbox
