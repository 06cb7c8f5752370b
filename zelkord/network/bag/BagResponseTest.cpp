#include <gtest/gtest.h>

#include "platform/testing/FakeSettings.h"
#include "platform/testing/RecordingLog.h"
#include "zelkord/network/bag/BagResponse.h"

namespace zelkord {
namespace {

constexpr std::string_view kWrongType =
    "Error fetching bag: returned data was not of the expected type.";

URLResult answer(std::optional<int> status, std::optional<std::string> body) {
  URLResult result;
  result.response = URLResponse{"https://h/bag", status, {}};
  if (body) result.data = Data(std::move(*body));
  return result;
}

URLResult brokenOff() {
  auto result = answer(200, R"({"version": "1"})");
  result.error = urlError(URLErrorCode::ConnectionLost);
  return result;
}

std::string nested(std::size_t depth) {
  return R"({"a":)" + std::string(depth, '[') + std::string(depth, ']') + "}";
}

TEST(BagResponseTest, TakesOnlyAnObjectWithStatus200) {
  struct Case {
    std::string_view name;
    URLResult result;
    std::string_view outcome;  // "bag", the reason, or the transport error's code
    std::string_view logged;
  };
  const std::string big = R"({"a": ")" + std::string(2'000'000, 'x') + "\"}";
  const Case cases[] = {
      {"object", answer(200, R"({"version": 12})"), "bag", R"(Got bag: {"version":12})"},
      {"empty object", answer(200, "{}"), "bag", "Got bag: {}"},
      {"wrong types inside", answer(200, R"({"enabled": "x", "agents": 3})"), "bag", "Got bag"},
      {"512 deep", answer(200, nested(511)), "bag", "Got bag"},
      {"array", answer(200, "[1]"), "not JSON object", kWrongType},
      {"string", answer(200, "\"x\""), "not JSON object", kWrongType},
      {"not JSON", answer(200, "<html>"), "not JSON object", "error parsing bag json "},
      {"empty", answer(200, ""), "not JSON object", kWrongType},
      {"cut off", answer(200, R"({"version": "1", "sea)"), "not JSON object", kWrongType},
      {"two documents", answer(200, "{}{}"), "not JSON object", kWrongType},
      {"not UTF-8", answer(200, "{\"a\": \"\xFF\"}"), "not JSON object", kWrongType},
      {"513 deep", answer(200, nested(512)), "not JSON object", kWrongType},
      {"10,000 deep", answer(200, nested(10'000)), "not JSON object", kWrongType},
      {"2 MB", answer(200, big), "-1103", "Error fetching bag: {"},
      {"2 MB of an error page", answer(500, big), "-1103", "Error fetching bag: {"},
      {"broken off", brokenOff(), "-1005", "Error fetching bag: {"},
      {"no data", answer(200, std::nullopt), "no data", kWrongType},
      {"no data, no HTTP", answer(std::nullopt, std::nullopt), "no data", kWrongType},
      {"304", answer(304, ""), "statusCode 304", "Error fetching bag status code: 304"},
      {"304 without data", answer(304, std::nullopt), "statusCode 304", "status code: 304"},
      {"500 with a bag", answer(500, "{}"), "statusCode 500", "status code: 500"},
      {"no HTTP", answer(std::nullopt, "{}"), "statusCode 0", "status code: 0"},
  };
  for (const auto& test : cases) {
    SCOPED_TRACE(test.name);
    RecordingLog sink;
    const auto response = readBagResponse(test.result, kDefaultMaximumBagSize, {sink, "c"});
    EXPECT_TRUE(sink.contains(test.logged)) << testing::PrintToString(sink.texts());
    ASSERT_NE(response.dictionary.has_value(), response.error.has_value());
    if (!response.error) {
      EXPECT_EQ(test.outcome, "bag");
    } else if (response.error->domain == kURLErrorDomain) {
      EXPECT_EQ(std::to_string(response.error->code), test.outcome);
    } else {
      EXPECT_EQ(*response.error, zelkorError(2, std::string(test.outcome)));
    }
  }
}

TEST(BagResponseTest, LogsABagWithoutItsPrivateParts) {
  const auto result = answer(200, R"({"search_url": "https://h/s?token=1", "n": 1, "resources":
      {"r": ["https://h/r?x#f", "why?"]}, "agents": {"a":
      {"subscription_provider_bundle_identifier_whitelist": ["com.example.tv"]}}})");
  RecordingLog sink;
  readBagResponse(result, kDefaultMaximumBagSize, {sink, "c"}, sink.showsPrivateData());
  EXPECT_TRUE(
      sink.contains(R"(Got bag: {"search_url":"https://h/s?<private>","n":1,"resources":)"
                    R"({"r":["https://h/r?<private>","why?"]},"agents":{"a":)"
                    R"({"subscription_provider_bundle_identifier_whitelist":"<private>"}}})"))
      << testing::PrintToString(sink.texts());
  readBagResponse(result, kDefaultMaximumBagSize, {sink, "c"}, true);
  EXPECT_TRUE(sink.contains("?token=1"));
  EXPECT_TRUE(sink.contains("com.example.tv"));
}

TEST(BagResponseTest, TheLimitIsASetting) {
  FakeSettings settings;
  EXPECT_EQ(maximumBagSize(settings), 1'048'576u);
  settings.set("ZLKMaximumBagSize", 2);
  EXPECT_EQ(maximumBagSize(settings), 2u);
  RecordingLog sink;
  EXPECT_TRUE(readBagResponse(answer(200, "{}"), 2, {sink, "c"}).dictionary);
  EXPECT_TRUE(readBagResponse(answer(200, "{ }"), 2, {sink, "c"}).error);
}

}  // namespace
}  // namespace zelkord
