#include <gtest/gtest.h>

#include "zelkorctl/Options.h"

namespace zelkorctl {
namespace {

using Words = std::vector<std::string>;

TEST(OptionsTest, TakesOptionsAnywhereInBothForms) {
  const auto parsed = parseArguments({"--json", "search", "--count=3", "a", "--item", "k=v=w",
                                      "--kind", "card", "--timeout", "0.5", "--", "--b"});
  ASSERT_TRUE(std::holds_alternative<Options>(parsed)) << std::get<UsageError>(parsed).text;
  const auto& options = std::get<Options>(parsed);
  EXPECT_EQ(options.command, Command::Search);
  EXPECT_EQ(options.arguments, (Words{"a", "--b"}));
  EXPECT_TRUE(options.json);
  EXPECT_EQ(options.count, 3);
  EXPECT_EQ(options.kind, QueryKind::Card);
  EXPECT_EQ(options.items.front(), (std::pair<std::string, std::string>("k", "v=w")));
  EXPECT_EQ(clientOptions(options).timeout, 500ms);
  EXPECT_EQ(clientOptions(options).configuration.identifier, "lanthe");
}

TEST(OptionsTest, RefusesWhatItCannotDo) {
  const struct {
    Words words;
    const char* problem;
  } cases[] = {
      {{}, "no command given"},
      {{"serach"}, "no command 'serach'"},
      {{"search"}, "search needs a text"},
      {{"search", "a", "--cuont"}, "no option '--cuont'"},
      {{"search", "a", "--count"}, "--count needs a value"},
      {{"search", "a", "--count", "0"}, "--count takes a number from 1 to 100000"},
      {{"search", "a", "--count", "1x"}, "--count takes a number from 1 to 100000"},
      {{"search", "a", "--timeout", "nan"}, "--timeout takes seconds, above 0 and up to 86400"},
      {{"search", "a", "--item", "=v"}, "--item takes NAME=VALUE"},
      {{"search", "a", "--json=1"}, "--json takes no value"},
      {{"bag", "--count", "2"}, "--count is for other commands"},
      {{"more"}, "more needs a text"},
      {{"images", "--save", "d"}, "images needs a text"},
      {{"zkw", "x"}, "zkw takes no arguments"},
      {{"more", "a", "--result", "2"}, "--result is for other commands"},
      {{"card", "a", "--domain", "d"}, "--domain is for other commands"},
      {{"lookup", "a", "--selection", "x"}, "--selection takes one of default, explicit, hint"},
      {{"images", "a", "--deadline", "600001"}, "--deadline takes a number from 0 to 600000"},
      {{"images", "--url", ""}, "--url takes a text"},
      {{"bag", "x"}, "bag takes no arguments"},
      {{"bag", "--socket", "a", "--address", "b"}, "--address and --socket exclude each other"},
      {{"defaults", "write", "k"}, "defaults takes read KEY, write KEY JSON, delete KEY or list"},
  };
  for (const auto& [words, problem] : cases) {
    SCOPED_TRACE(problem);
    const auto parsed = parseArguments(words);
    ASSERT_TRUE(std::holds_alternative<UsageError>(parsed));
    EXPECT_EQ(std::get<UsageError>(parsed).text, problem);
  }
}

TEST(OptionsTest, AsksForNoTextWhereNoneIsNeeded) {
  for (const auto& words : {Words{"search", "--kind", "zeroKeyword"}, Words{"search", "--help"},
                            Words{"search", "--kind=card", "--url", "https://a/"}, Words{"zkw"},
                            Words{"more", "--url", "https://a/", "--endpoint"},
                            Words{"images", "--id", "word", "--url", "a", "--id=b"}}) {
    EXPECT_TRUE(std::holds_alternative<Options>(parseArguments(words)));
  }
}

}  // namespace
}  // namespace zelkorctl
