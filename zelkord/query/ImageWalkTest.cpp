#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "zelkord/query/ImageWalk.h"

namespace zelkord {
namespace {

std::vector<std::string> imagesFoundIn(const std::string& text, const ImageKeys* keys = nullptr) {
  std::vector<std::string> found;
  enumerateImagesInResponse(
      parseJson(text).value(),
      [&found](const json::value& value) { found.push_back(json::serialize(value)); }, keys);
  return found;
}

TEST(ImageWalkTest, FindsDescriptorsUnderTheirKeysAtAnyDepth) {
  const std::pair<std::string, std::vector<std::string>> cases[] = {
      {R"({"icon":{"id":"1"}})", {R"({"id":"1"})"}},
      {R"([{"results":[{"card":{"x":[[{"posters":[{"id":"1"},{"id":"2"}]}]]}}]}])",
       {R"({"id":"1"})", R"({"id":"2"})"}},
      {R"({"icon":{"icon":{"id":"1"}}})", {R"({"icon":{"id":"1"}})"}},
      {R"({"icon":[7,null,[{"glyph":{}}]]})", {"7", "null", R"([{"glyph":{}}])"}},
      {R"({"icon":"text","image":7,"glyph":null,"thumbnail":true})", {}},
      {R"({"Icon":{"id":"1"},"icons":{"id":"2"},"":{"id":"3"}})", {}},
      {R"({"icon":{}})", {"{}"}},
      {"[]", {}},
      {"7", {}},
  };
  for (const auto& [text, expected] : cases) EXPECT_EQ(imagesFoundIn(text), expected) << text;
}

TEST(ImageWalkTest, KnowsItsKeysAndThoseOfTheCaller) {
  json::object all;
  for (const auto key : imageKeys()) all[key] = json::object{};
  EXPECT_EQ(imagesFoundIn(json::serialize(all)).size(), 19u);
  const ImageKeys others = {"logo"};
  EXPECT_THAT(imagesFoundIn(R"({"icon":{"logo":{"id":"1"}},"logo":[{"id":"2"}]})", &others),
              testing::ElementsAre(R"({"id":"1"})", R"({"id":"2"})"));
}

TEST(ImageWalkTest, ReachesTheDeepestValueThatParses) {
  const auto nested = [](std::size_t depth) {
    return std::string(depth, '[') + R"({"icon":{"id":"1"}})" + std::string(depth, ']');
  };
  EXPECT_EQ(imagesFoundIn(nested(kMaximumJsonDepth - 2)).size(), 1u);
  json::value deeper = json::object{{"icon", json::object{}}};
  for (std::size_t i = 0; i < 10 * kMaximumJsonDepth; ++i) {
    json::array array;
    array.push_back(std::move(deeper));
    deeper = std::move(array);
  }
  int found = 0;
  enumerateImagesInResponse(deeper, [&found](const json::value&) { ++found; });
  EXPECT_EQ(found, 0);
}

TEST(ImageWalkTest, ListsIdentifiersWithoutBytes) {
  const auto response = parseJson(R"([{"icon":[
      {"id":"bare"}, {"id":"empty","data":""}, {"id":"odd","data":7}, {"id":"full","data":"AA=="},
      {"id":7}, {"url":"https://a.example/"}, "id", {"id":"both","url":"https://a.example/"}]}])");
  std::vector<std::string> identifiers;
  for (const auto& descriptor : collectResponseImageIdentifiers(*response)) {
    identifiers.push_back(*descriptor.id);
  }
  EXPECT_THAT(identifiers, testing::ElementsAre("bare", "empty", "odd", "both"));
}

TEST(ImageWalkTest, OrdersURLsBeforeTheirStandIns) {
  const ZLKBag bag(std::make_shared<const json::object>(parseJson(R"({"image_identifiers":{
                       "one":"https://id.example/1","two":"https://id.example/2",
                       "same":"https://a.example/x","broken":"nowhere"}})")
                                                            ->as_object()),
                   std::nullopt);
  const auto descriptors = parseJson(R"([
      {"url":"https://a.example/x","id":"one"},
      {"id":"two"},
      {"url":"https://a.example/x","id":"unreached"},
      {"url":"https://a.example/y","id":"same"},
      {"url":"not a url","id":"one"},
      {"url":"https://user@b.example/","id":"broken"},
      {"url":7,"id":"two"},
      {"url":"https://C.example/z"}, {}, 7])");
  ImageHosts hosts;
  OrderedImages images;
  for (const auto& value : descriptors->as_array()) {
    collectOrderedImages(ImageDescriptor::of(value), bag, &hosts, images);
  }
  EXPECT_THAT(images.primary, testing::ElementsAre("https://a.example/x", "https://id.example/2",
                                                   "https://a.example/y", "https://C.example/z"));
  EXPECT_THAT(images.secondary, testing::ElementsAre("https://id.example/1"));
  EXPECT_THAT(hosts, testing::ElementsAre("a.example", "c.example", "id.example"));
}

}  // namespace
}  // namespace zelkord
