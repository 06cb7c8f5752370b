#include <gtest/gtest.h>

#include "sandbox/http/Target.h"

namespace sandbox {

TEST(TargetTest, DecodesAsFormsAre) {
  struct Case {
    const char* target;
    Target parsed;
  };
  const std::initializer_list<Case> cases = {
      {"/search", {"/search", {}}},
      {"/search?", {"/search", {}}},
      {"/a+b%20c?q=a+b%2Bc", {"/a+b c", {{"q", "a b+c"}}}},
      {"/s?q=&n&=v", {"/s", {{"q", ""}, {"n", std::nullopt}, {"", "v"}}}},
      {"/s?q=1&q=2&&k=a=b?/", {"/s", {{"q", "1"}, {"q", "2"}, {"k", "a=b?/"}}}},
      {"/s?q=%00%ff#rest", {"/s", {{"q", std::string("\0\xFF", 2)}}}},
  };
  for (const auto& [target, parsed] : cases) {
    SCOPED_TRACE(target);
    EXPECT_EQ(parseTarget(target), parsed);
  }
}

TEST(TargetTest, RefusesWhatIsNoTarget) {
  for (const char* target : {"", "search", "http://x/", "*", "/%", "/%4", "/%g0", "/s?q=%"}) {
    SCOPED_TRACE(target);
    EXPECT_FALSE(parseTarget(target));
  }
}

TEST(TargetTest, EncodedTextDecodesToItself) {
  const std::string text = "c++ & ü/?#%";
  EXPECT_EQ(parseTarget("/s?q=" + percentEncoded(text))->items.at(0).value, text);
}

}  // namespace sandbox
