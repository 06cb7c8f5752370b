#include <gtest/gtest.h>

#include <limits>

#include "zelkord/network/context/HeaderJson.h"

namespace zelkord {
namespace {

TEST(HeaderJsonTest, WritesCompactlyWithShortNumbers) {
  const std::pair<std::string_view, std::string_view> cases[] = {
      {" [ ] ", "[]"},
      {"{ }", "{}"},
      {R"({"b" : [1, 2.50, -0.1, 1e300, null], "a": {"x": true}})",
       R"({"b":[1,2.5,-0.1,1e+300,null],"a":{"x":true}})"},
      {R"(["a/b", "\u00e4\n\"", "\u007f"])", R"(["a/b","ä\n\"","\u007f"])"},
      {"18446744073709551615", "18446744073709551615"},
  };
  for (const auto& [text, written] : cases) {
    SCOPED_TRACE(text);
    EXPECT_EQ(headerJson(*parseJson(text)), written);
  }
}

TEST(HeaderJsonTest, RefusesWhatJsonCannotSay) {
  EXPECT_EQ(headerJson(json::array{std::numeric_limits<double>::infinity()}), std::nullopt);
  EXPECT_EQ(headerJson(json::array{std::numeric_limits<double>::quiet_NaN()}), std::nullopt);
  EXPECT_EQ(headerJson(json::object{{"a", "\xc3"}}), std::nullopt);
  EXPECT_EQ(headerJson(json::object{{"\xc3", 1}}), std::nullopt);
}

}  // namespace
}  // namespace zelkord
