#include <gtest/gtest.h>

#include <boost/json/parse.hpp>

#include "sandbox/TestData.h"
#include "sandbox/service/Images.h"
#include "sandbox/service/Resources.h"

namespace sandbox {

namespace {

Request requestFor(const std::string& target, Headers headers = {}) {
  const auto parsed = parseTarget(target);
  Request request;
  request.path = parsed->path;
  request.items = parsed->items;
  request.headers = std::move(headers);
  return request;
}

}  // namespace

TEST(ResourcesTest, NamesAPlaceByWholeDegrees) {
  for (const auto& [text, place] :
       std::initializer_list<std::pair<const char*, const char*>>{{"48.137,11.575", "n48e011"},
                                                                  {"-33.9,-151.2", "s33w151"},
                                                                  {"0,0", "n00e000"},
                                                                  {"91,0", "world"},
                                                                  {"nan,1", "world"},
                                                                  {"", "world"},
                                                                  {"48", "world"}}) {
    SCOPED_TRACE(text);
    EXPECT_EQ(placeOf(text), place);
  }
}

TEST(ResourcesTest, HintsRedirectToTheirPlaceWhereTheSignatureIsTheTag) {
  const Resources resources("https://localhost:1");
  const Reply redirect = resources.answer(
      requestFor("/resource/lookup_hints_weekly?key=k", {{"X-Quenta-FuzzedLatLong", "48.1,11.5"}}));
  EXPECT_EQ(redirect.status, 302U);
  EXPECT_EQ(findHeader(redirect.headers, "Location"),
            "https://localhost:1/resource/weekly/2/n48e011?key=k");
  const Reply file = resources.answer(requestFor("/resource/weekly/2/n48e011"));
  EXPECT_EQ(boost::json::parse(file.bodyText()).at("signature"), "2-n48e011-weekly");
  EXPECT_EQ(
      resources
          .answer(requestFor("/resource/weekly/2/n48e011", {{"If-None-Match", "2-n48e011-weekly"}}))
          .status,
      304U);
}

TEST(ResourcesTest, EveryListedFileIsThereAndItsVersionSparesADownload) {
  const Resources resources("https://localhost:1");
  for (const auto name : resourceNames()) {
    SCOPED_TRACE(name);
    const std::string target = "/resource/" + std::string(name);
    const Reply reply = resources.answer(requestFor(target));
    if (reply.status == 302) continue;
    EXPECT_EQ(reply.status, 200U);
    EXPECT_TRUE(boost::json::parse(reply.bodyText()).is_object());
    EXPECT_EQ(
        resources.answer(requestFor(target, {{"If-None-Match", std::string(resourceVersion())}}))
            .status,
        304U);
  }
  for (const char* target :
       {"/resource/", "/resource/none", "/resource/lookup_hints_daily", "/resource/daily/2/x"}) {
    EXPECT_EQ(resources.answer(requestFor(target)).status, 404U) << target;
  }
}

TEST(ResourcesTest, TheAppListIsJsonWithinJson) {
  const Resources resources("https://localhost:1");
  const auto outer = boost::json::parse(
      resources.answer(requestFor("/resource/installed_app_whitelist")).bodyText());
  EXPECT_EQ(outer.at("compression"), "RLE");
  const auto inner = boost::json::parse(outer.at("apps").get_string());
  EXPECT_EQ(inner.at("apps").at("org.mozilla.firefox").at(0).at("encoding_id"), 16);
}

TEST(ImagesTest, ServesFlagsAndGlyphsThatClientsCanKeep) {
  const TemporaryFolder folder;
  const Images images(writeTinyData(folder.path()).flags());
  for (const char* path : {"/image/flags/fr.png", "/image/glyph/word.png"}) {
    SCOPED_TRACE(path);
    const Reply reply = images.answer(requestFor(path));
    EXPECT_TRUE(reply.bodyText().starts_with("\x89PNG"));
    const std::string tag(findHeader(reply.headers, "ETag").value_or(""));
    EXPECT_EQ(images.answer(requestFor(path, {{"If-None-Match", tag}})).status, 304U);
  }
  EXPECT_EQ(images.answer(requestFor("/image/flags/../fr.png")).status, 404U);
}

}  // namespace sandbox
