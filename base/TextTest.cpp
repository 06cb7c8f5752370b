#include <gtest/gtest.h>

#include "base/Text.h"

namespace zelkor {
namespace {

TEST(TextTest, ReplacesNoncharactersAndNothingElse) {
  const struct {
    const char* name;
    std::string text;
    std::string expected;
  } cases[] = {
      {"none", "", ""},
      {"ASCII", "twelve bytes", "twelve bytes"},
      {"the last of the plane", "a\xEF\xBF\xBE\xEF\xBF\xBF", "a\xEF\xBF\xBD\xEF\xBF\xBD"},
      {"of other planes",
       "\xF0\x9F\xBF\xBE"
       "b"
       "\xF4\x8F\xBF\xBF",
       "\xEF\xBF\xBD"
       "b"
       "\xEF\xBF\xBD"},
      {"the block", "\xEF\xB7\x90 \xEF\xB7\xAF", "\xEF\xBF\xBD \xEF\xBF\xBD"},
      {"beside the block", "\xEF\xB7\x8F\xEF\xB7\xB0", "\xEF\xB7\x8F\xEF\xB7\xB0"},
      {"replacement characters", "\xEF\xBF\xBD\xF0\x9F\xBF\xBD", "\xEF\xBF\xBD\xF0\x9F\xBF\xBD"},
      {"behind eight of ASCII",
       "12345678\xEF\xBF\xBE"
       "9",
       "12345678\xEF\xBF\xBD"
       "9"},
      {"not UTF-8", "\xEF\xBF\xFF\xEF\xBF", "\xEF\xBF\xFF\xEF\xBF"},
  };
  for (const auto& [name, text, expected] : cases) {
    SCOPED_TRACE(name);
    EXPECT_EQ(replaceNoncharacters(text), expected);
    EXPECT_EQ(hasNoncharacters(text), text != expected);
  }
}

}  // namespace
}  // namespace zelkor
