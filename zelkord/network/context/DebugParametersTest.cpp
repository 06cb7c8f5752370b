#include <gtest/gtest.h>

#include "zelkord/network/context/DebugParameters.h"

namespace zelkord {
namespace {

TEST(DebugParametersTest, TakesPairsOrNothingAtAll) {
  struct Case {
    std::string_view text;
    std::vector<QueryItem> items;
    std::string_view invalid;
    bool valid;
  };
  const Case cases[] = {
      {"", {}, "", true},
      {"a=1", {{"a", "1"}}, "", true},
      {"b=2&a=1&b=3", {{"b", "2"}, {"a", "1"}, {"b", "3"}}, "", true},
      {"a=&=1", {{"a", ""}, {"", "1"}}, "", true},
      {"a=1&b", {}, "b", false},
      {"a=1&b=2=3&c", {}, "b=2=3", false},
      {"a=1&", {}, "", false},
      {"a=1&&b=2", {}, "", false},
      {"&", {}, "", false},
  };
  for (const auto& [text, items, invalid, valid] : cases) {
    SCOPED_TRACE(text);
    const auto parameters = parseDebugParameters(text);
    EXPECT_EQ(parameters.items, items);
    EXPECT_EQ(parameters.invalid, invalid);
    EXPECT_EQ(parameters.valid, valid);
  }
}

}  // namespace
}  // namespace zelkord
