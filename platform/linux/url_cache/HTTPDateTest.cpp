#include <gtest/gtest.h>

#include <cstdint>

#include "platform/linux/url_cache/HTTPDate.h"

namespace zelkord {
namespace {

TEST(HTTPDateTest, ReadsThreeFormsAndNothingElse) {
  constexpr std::int64_t kBad = -1;
  const struct {
    const char* text;
    std::int64_t expected;
  } cases[] = {
      {"Sun, 06 Nov 1994 08:49:37 GMT", 784111777},
      {"Sunday, 06-Nov-94 08:49:37 GMT", 784111777},
      {"Sun Nov  6 08:49:37 1994", 784111777},
      {"Wed Nov 16 08:49:37 1994", 784975777},
      {"Thu, 29 Feb 2024 00:00:00 GMT", 1709164800},
      {"Sat, 31 Dec 2016 23:59:60 GMT", 1483228800},
      {"Fri, 31 Dec 9999 23:59:59 GMT", 253402300799},
      // Fifty years ahead, and one more.
      {"Friday, 01-Jan-76 00:00:00 GMT", 3345062400},
      {"Saturday, 01-Jan-77 00:00:00 GMT", 220924800},
      {"Thu, 29 Feb 2023 00:00:00 GMT", kBad},
      {"Sun, 06 Nov 1994 24:00:00 GMT", kBad},
      {"Sun, 06 Nov 1994 08:60:37 GMT", kBad},
      {"Sun, 00 Nov 1994 08:49:37 GMT", kBad},
      {"Sun, 06 nov 1994 08:49:37 GMT", kBad},
      {"Sun, 06 anF 1994 08:49:37 GMT", kBad},
      {"Sun, 06 Nov 1994 08:49:37 CET", kBad},
      {"Sun, 06 Nov 1994 08:49:37 GMT, Sun, 06 Nov 1994 08:49:37 GMT", kBad},
      {"Sun,06 Nov 1994 08:49:37 GMT", kBad},
      {", 06 Nov 1994 08:49:37 GMT", kBad},
      {"Sun, +6 Nov 1994 08:49:37 GMT", kBad},
      {"0", kBad},
      {"Sun", kBad},
      {"Sun,", kBad},
      {"", kBad},
  };
  const std::chrono::sys_seconds now{std::chrono::seconds(1'795'348'800)};  // in 2026
  for (const auto& [text, expected] : cases) {
    SCOPED_TRACE(text);
    const auto date = parseHTTPDate(text, now);
    EXPECT_EQ(date ? date->time_since_epoch().count() : kBad, expected);
  }
}

}  // namespace
}  // namespace zelkord
