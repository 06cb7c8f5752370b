#include <gtest/gtest.h>

#include "zelkord/network/bag/BagRefreshRule.h"

namespace zelkord {
namespace {

using Reason = BagRefreshDecision::Reason;

constexpr double kNowSeconds = 1'800'000'000;

TEST(BagRefreshRuleTest, DecidesByTheDaemonsKeys) {
  struct Case {
    std::string_view bag;  // times are given relative to now, see below
    Reason reason;
  };
  const Case cases[] = {
      {R"({"e": 599})", Reason::Expired},
      {R"({"e": 599.999})", Reason::Expired},
      {R"({"e": 600, "__bagurl": "u"})", Reason::UpToDate},
      {R"({"e": 14400, "__bagurl": "u"})", Reason::UpToDate},
      {R"({"e": 14400, "__bagurl": "other"})", Reason::URLChanged},
      {R"({"e": 14400})", Reason::NoURL},
      {R"({"e": 14400, "__bagurl": 5})", Reason::NoURL},
      {R"({"e": -1, "__bagurl": "u"})", Reason::Expired},
      {R"({"__bagurl": "u"})", Reason::Expired},
      {R"({"__expiration": "9e12", "__bagurl": "u"})", Reason::Expired},
      {R"({"e": -1, "__refresh_disabled": false})", Reason::Disabled},
      {R"({"e": -1, "__refresh_disabled": null})", Reason::Disabled},
      {R"({})", Reason::Expired},
  };
  const auto now = wallTimeOfSeconds(kNowSeconds);
  for (const auto& test : cases) {
    auto bag = parseJson(test.bag)->as_object();
    if (const auto left = numberIn(bag, "e")) bag[kBagExpirationKey] = kNowSeconds + *left;
    const auto decision = decideBagRefresh(&bag, now, [] { return std::string_view("u"); });
    EXPECT_EQ(decision.reason, test.reason) << test.bag;
    EXPECT_EQ(decision.isRequired(),
              test.reason != Reason::Disabled && test.reason != Reason::UpToDate);
  }
  EXPECT_EQ(decideBagRefresh(nullptr, now, [] { return std::string_view("u"); }).reason,
            Reason::NoURL);
}

}  // namespace
}  // namespace zelkord
