#include <gtest/gtest.h>

#include "platform/linux/url_cache/CachePolicyTestSupport.h"
#include "platform/linux/url_cache/CacheRules.h"
#include "platform/linux/url_cache/CacheValidation.h"
#include "platform/linux/url_cache/CacheVary.h"

namespace zelkord {
namespace {

URLRequest requestForTest(std::string_view headers, std::string method = "GET") {
  return {.url = "https://host/", .method = std::move(method), .headers = headersForTest(headers)};
}

TEST(CacheRulesTest, UsesTheCacheAsTheRequestAllows) {
  const struct {
    URLRequest request;
    CacheUse use;
  } cases[] = {
      {requestForTest(""), CacheUse::LookUpAndStore},
      {requestForTest("Cache-Control: no-cache"), CacheUse::LookUpAndStore},
      {requestForTest("", "POST"), CacheUse::None},
      {requestForTest("", "HEAD"), CacheUse::None},
      {requestForTest("authorization: x"), CacheUse::None},
      {requestForTest("Range: bytes=0-1"), CacheUse::None},
      {requestForTest("Cache-Control: max-age=0, No-Store"), CacheUse::None},
      {requestForTest("if-none-match: \"a\""), CacheUse::StoreOnly},
      {requestForTest("If-Modified-Since: x"), CacheUse::StoreOnly},
      {{.url = "u", .cachePolicy = CachePolicy::ReloadIgnoringLocalCache}, CacheUse::StoreOnly},
  };
  for (const auto& [request, use] : cases) {
    SCOPED_TRACE(request.method + (request.headers.empty() ? "" : request.headers[0].second));
    EXPECT_EQ(cacheUseOf(request), use);
  }
}

TEST(CacheRulesTest, StoresWhatCanBeOfUseAgain) {
  const struct {
    const char* headers;
    int status;
    bool stored;
  } cases[] = {
      {"", 200, false},
      {"Content-Type: application/json\nVary: Accept", 200, false},
      {"Cache-Control: max-age=60", 200, true},
      {"Cache-Control: max-age=60", 500, true},
      {"Cache-Control: max-age=60", 599, true},
      {"Cache-Control: max-age=60, must-understand", 599, false},
      {"Cache-Control: max-age=60, must-understand", 404, true},
      {"Cache-Control: max-age=60", 206, false},
      {"Cache-Control: max-age=60", 304, false},
      {"Cache-Control: private, max-age=60", 200, true},
      {"Cache-Control: max-age=60\nVary: accept", 200, true},
      {"Cache-Control: max-age=60\nVary: accept, *", 200, false},
      {"Cache-Control: max-age=0", 200, false},
      {"Cache-Control: no-cache", 200, false},
      {"Cache-Control: no-cache\nETag: \"a\"", 200, true},
      {"Cache-Control: no-store\nETag: \"a\"", 200, false},
      {"Cache-Control: max-age=60, ext=\"", 200, false},
      {"ETag: \"a\"", 200, true},
      {"ETag: \"a\"", 503, false},
      {"Last-Modified: Sun, 22 Nov 2026 11:00:00 GMT", 200, true},
      {"Last-Modified: whenever", 200, false},
      {"Expires: 0", 200, false},
      {"Expires: Sun, 22 Nov 2026 12:01:00 GMT", 302, true},
  };
  for (const auto& [headers, status, stored] : cases) {
    SCOPED_TRACE(std::to_string(status) + " " + headers);
    const auto candidate = storedForTest(headersForTest(headers), status);
    const URLResult result{.data = candidate.body, .response = candidate.response};
    EXPECT_EQ(mayBeStored(result, candidate), stored);
    EXPECT_TRUE(saysHowToStore(candidate.response) || !stored);
  }
  const auto good = storedForTest({{"Cache-Control", "max-age=60"}});
  const Error cut = urlError(URLErrorCode::ConnectionLost, "cut off");
  EXPECT_FALSE(mayBeStored({.data = good.body, .response = good.response, .error = cut}, good));
}

TEST(CacheVaryTest, MatchesByTheNamedHeaders) {
  const auto namesFor = [](std::string vary) {
    return varyNames(URLResponse{.headers = {{"Vary", std::move(vary)}}});
  };
  EXPECT_EQ(namesFor("Accept-Language, accept,ACCEPT , ,"), "accept,accept-language");
  EXPECT_EQ(namesFor(""), "");
  for (const char* hopeless : {"*", "accept, *", "a b", "accept, \"", "\xFF"}) {
    EXPECT_EQ(namesFor(hopeless), std::nullopt) << hopeless;
  }
  EXPECT_TRUE(namesFor(std::string(kMaximumVaryNames, 'a')));
  EXPECT_FALSE(namesFor(std::string(kMaximumVaryNames, 'a') + ", b"));
  const auto variant = [](std::string_view headers) {
    return variantOf("accept,x-mode", requestForTest(headers));
  };
  EXPECT_EQ(variant("Accept: a\nX-Mode: 1"), variant("x-mode: 1 \nOther: 2\nACCEPT:  a"));
  const char* const different[] = {"",
                                   "Accept: a",
                                   "X-Mode: a",
                                   "Accept: ",
                                   "X-Mode: ",
                                   "Accept: a\nX-Mode: b",
                                   "Accept: a=1:b",
                                   "Accept: a\nAccept: b"};
  for (const char* one : different) {
    for (const char* other : different) {
      EXPECT_EQ(variant(one) == variant(other), one == other) << one << " | " << other;
    }
  }
}

TEST(CacheValidationTest, AsksWithWhatCanBeSent) {
  const std::string date = "Sun, 22 Nov 2026 11:00:00 GMT";
  const struct {
    std::string headers;
    std::string tag;
    std::string modified;
  } cases[] = {
      {"ETag: W/\"a\"\nLast-Modified: " + date, "W/\"a\"", date},
      {"ETag: bare", "bare", ""},
      {"Last-Modified: " + date, "", date},
      {"ETag: \"a\"\nETag: \"b\"", "", ""},
      {"ETag: ", "", ""},
      {std::string("ETag: \"a\x01\""), "", ""},
      {"ETag: \"" + std::string(2000, 'a') + "\"", "", ""},
      {"Last-Modified: whenever", "", ""},
  };
  for (const auto& [headers, tag, modified] : cases) {
    SCOPED_TRACE(headers.substr(0, 60));
    const auto stored = storedForTest(headersForTest(headers));
    const auto request = requestForTest("Accept: a");
    const auto conditional = conditionalRequest(request, stored);
    EXPECT_EQ(conditional.header("If-None-Match").value_or(""), tag);
    EXPECT_EQ(conditional.header("If-Modified-Since").value_or(""), modified);
    EXPECT_EQ(hasValidator(stored.response), !tag.empty() || !modified.empty());
    EXPECT_EQ(unconditionalRequest(conditional).headers, request.headers);
  }
}

TEST(CacheValidationTest, TakesOverTheHeadersOfA304) {
  const auto stored = storedForTest(
      headersForTest("ETag: \"a\"\nX: old\nX: older\nContent-Length: 4\nAge: 5\nKeep: me"));
  const URLResponse news{.status = 304,
                         .headers = headersForTest("x: new\nContent-Length: 0\nContent-Encoding: "
                                                   "br\nConnection: close, Y\nY: hop\nDate: d")};
  const auto fresh = freshened(stored, news, kCacheTestTime + 1s, kCacheTestTime + 2s);
  EXPECT_EQ(fresh.response.headers,
            headersForTest("ETag: \"a\"\nContent-Length: 4\nKeep: me\nx: new\nDate: d"));
  EXPECT_EQ(fresh.response.status, 200);
  EXPECT_EQ(fresh.body, stored.body);
  EXPECT_EQ(fresh.requestedAt, kCacheTestTime + 1s);
  EXPECT_EQ(fresh.receivedAt, kCacheTestTime + 2s);

  const auto damaged = headersForTest("Connection: Y, \"open\nY: hop\nZ: end");
  EXPECT_EQ(endToEndHeaders(damaged), headersForTest("Z: end"));

  const auto confirmsTag = [&stored](std::string tag) {
    return confirms({.headers = {{"ETag", std::move(tag)}}}, stored);
  };
  EXPECT_TRUE(confirms({}, stored));
  EXPECT_TRUE(confirmsTag("W/\"a\""));
  EXPECT_FALSE(confirmsTag("\"b\""));
}

}  // namespace
}  // namespace zelkord
