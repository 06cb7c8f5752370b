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
      {{"search", "++"}, "++ stands behind --"},
      {{"bag", "-x"}, "no option '-x'"},
      {{"search", "a", "--count", "0"}, "--count takes a number from 1 to 100000"},
      {{"search", "a", "--count", "1x"}, "--count takes a number from 1 to 100000"},
      {{"search", "a", "--timeout", "nan"}, "--timeout takes seconds, above 0 and up to 86400"},
      {{"search", "a", "--item", "=v"}, "--item takes NAME=VALUE"},
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

TEST(OptionsTest, RefusesValuesInTheWrongPlace) {
  for (const auto& words : {Words{"search", "a", "--json=1"}, Words{"search", "a", "--count"},
                            Words{"search", "a", "--count="}, Words{"--count"}}) {
    SCOPED_TRACE(testing::PrintToString(words));
    EXPECT_TRUE(std::holds_alternative<UsageError>(parseArguments(words)));
  }
}

TEST(OptionsTest, LeavesWordsAsTheyAre) {
  const struct {
    Words words;
    Words arguments;
  } cases[] = {
      {{"defaults", "write", "KEY", "-5"}, {"write", "KEY", "-5"}},
      {{"defaults", "write", "KEY", "-0.5e3"}, {"write", "KEY", "-0.5e3"}},
      {{"defaults", "write", "KEY", "[1,2]"}, {"write", "KEY", "[1,2]"}},
      {{"defaults", "write", "KEY", "{}"}, {"write", "KEY", "{}"}},
      {{"defaults", "write", "KEY", "[]"}, {"write", "KEY", "[]"}},
      {{"search", "[a,b]", "", "more", "search"}, {"[a,b]", "", "more", "search"}},
      {{"search", "--", "++", "--count=", "--"}, {"++", "--count=", "--"}},
      {{"search", "a=b", "c:d", "%", "/x"}, {"a=b", "c:d", "%", "/x"}},
      {{"report", "HVX", "-"}, {"HVX", "-"}},
      {{"lookup", "--context=", "bank"}, {"bank"}},
      {{"search", "a", "--item", "n=[1,2]", "b"}, {"a", "b"}},
      {{"help", "search"}, {"search"}},
  };
  for (const auto& [words, arguments] : cases) {
    SCOPED_TRACE(testing::PrintToString(words));
    const auto parsed = parseArguments(words);
    ASSERT_TRUE(std::holds_alternative<Options>(parsed)) << std::get<UsageError>(parsed).text;
    EXPECT_EQ(std::get<Options>(parsed).arguments, arguments);
  }
  const auto items = parseArguments({"search", "a", "--item", "n=[1,2]", "--item=[x]=y"});
  EXPECT_EQ(std::get<Options>(items).items,
            (std::vector<std::pair<std::string, std::string>>{{"n", "[1,2]"}, {"[x]", "y"}}));
  EXPECT_EQ(std::get<Options>(parseArguments({"--version"})).command, Command::Version);
  EXPECT_TRUE(std::get<Options>(parseArguments({"bag", "-h"})).help);
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
