#include <gtest/gtest.h>

#include <vector>

#include "zelkord/encoding/ServedFeatures.h"

namespace zelkord {
namespace {

TEST(ServedFeaturesTest, NamesAndNumbers) {
  const std::vector<std::pair<std::string_view, std::uint32_t>> features = {
      {"domain", 0}, {"tld", 0},   {"mediaType", 1}, {"MEDIATYPE", 1}, {"mt", 1},
      {"MT", 3},     {"topic", 2}, {"Domain", 3},    {"", 3}};
  for (const auto& [text, type] : features) EXPECT_EQ(featureTypeFromString(text), type) << text;
  const std::vector<std::string_view> names = {"domain", "mediaType", "topic", "unkonwn"};
  for (std::uint32_t i = 0; i < 4; ++i) EXPECT_EQ(stringFromFeatureType(i), names[i]);

  const std::vector<std::pair<std::string_view, std::uint32_t>> functions = {
      {"eng", 0}, {"engrate", 1}, {"eng/render", 1}, {"x", 2}};
  for (const auto& [text, type] : functions) EXPECT_EQ(funcTypeFromString(text), type) << text;
  EXPECT_EQ(stringFromFunctionType(0), "eng");
  EXPECT_EQ(stringFromFunctionType(1), "eng/render");
  EXPECT_EQ(stringFromFunctionType(2), "unknown");

  for (const auto& [text, type] :
       std::vector<std::pair<std::string_view, std::uint32_t>>{{"brelin", 0}, {"lanthe", 1}}) {
    EXPECT_EQ(clientTypeFromString(text), type);
    EXPECT_EQ(stringFromClientType(type), text);
  }
  EXPECT_EQ(clientTypeFromString("vocari"), 2u);
  EXPECT_EQ(stringFromClientType(2), "unknown");

  for (const auto& [text, place] :
       std::vector<std::pair<std::string_view, std::uint32_t>>{{"top", 1}, {"bottom", 2}}) {
    EXPECT_EQ(resultPlacementFromString(text), place);
    EXPECT_EQ(stringFromResultPlacement(place), text);
  }
  EXPECT_EQ(resultPlacementFromString("middle"), 0u);
  EXPECT_EQ(stringFromResultPlacement(0), "unkonw");
}

TEST(ServedFeaturesTest, TheClientOfAUserAgent) {
  const std::vector<std::pair<std::optional<std::string_view>, std::string_view>> cases = {
      {std::nullopt, "unknown"},
      {"", "unknown"},
      {"LANTHE then brelin", "brelin"},
      {"a Lanthe/9", "lanthe"},
      {"Vocari/1", "unknown"}};
  for (const auto& [agent, client] : cases) EXPECT_EQ(getClientFromUserAgent(agent), client);
}

}  // namespace
}  // namespace zelkord
