#include <gtest/gtest.h>

#include <boost/json/serialize.hpp>
#include <set>

#include "sandbox/TestData.h"
#include "sandbox/core/Text.h"
#include "sandbox/search/LookupAnswers.h"
#include "sandbox/search/PopularAnswers.h"
#include "sandbox/search/SearchAnswers.h"

namespace sandbox {

namespace {

namespace json = boost::json;

std::string textAt(const json::value& value, std::string_view name) {
  return std::string(value.get_object().at(name).get_string());
}

std::vector<std::string> titlesOf(const json::value& set) {
  std::vector<std::string> titles;
  for (const auto& result : set.get_object().at("results").get_array())
    titles.push_back(textAt(result, "title"));
  return titles;
}

class AnswersTest : public ::testing::Test {
 protected:
  TinyIndex index_;
  const ResultWriter writer_{"https://localhost:1"};
  const SearchAnswers search_{index_.pool(), writer_};
};

}  // namespace

TEST_F(AnswersTest, CompletesWhatIsTyped) {
  struct Case {
    const char* typed;
    const char* completed;
    const char* firstTitle;
  };
  for (const auto& [typed, completed, firstTitle] : std::initializer_list<Case>{
           {"sno", "snow", "snow"},
           {"SNO", "snow", "snow"},
           {"fra", "france", "France"},
           {"fren", "french republic", "France"},
           {"côte D", "côte d'ivoire", "Côte d'Ivoire"},
           {"cote d", "cote d'ivoire", "Côte d'Ivoire"},
           {"south", "south korea", "South Korea"},
           {"kor", "korea", "South Korea"},
           {"greek small letter al", "greek small letter alpha", "greek small letter alpha"},
           {"letter b", "letter beta", "greek small letter beta"},
           {"black  F", "black  forest", "Black Forest"},
           {"forest", "forest", "Black Forest"},
           {"heart s", "heart suit", "heart suit"},
           {"u+2665", "u+2665", "heart suit"},
           {"zz29", "zz29", "zz29"}}) {
    SCOPED_TRACE(typed);
    const auto sets = search_.search(typed);
    EXPECT_EQ(textAt(sets.at(0), "query"), completed);
    ASSERT_FALSE(titlesOf(sets.at(0)).empty());
    EXPECT_EQ(titlesOf(sets.at(0)).front(), firstTitle);
  }
}

TEST_F(AnswersTest, EveryCompletedQueryBeginsWithWhatWasTypedAndAnExactWordIsNotLostInACrowd) {
  for (const char* typed : {"s", "z", "zz", "zz1", "Zz", "h", "F"}) {
    SCOPED_TRACE(typed);
    for (const auto& set : search_.search(typed)) {
      EXPECT_TRUE(textAt(set, "query").starts_with(lowerCased(typed)));
      EXPECT_FALSE(titlesOf(set).empty());
    }
  }
  EXPECT_EQ(titlesOf(search_.search("zz1").at(0)).front(), "zz1");
}

TEST_F(AnswersTest, WhatNothingBeginsWithIsLookedForInDescriptions) {
  const auto sets = search_.search("ice crys");
  EXPECT_EQ(textAt(sets.at(0), "query"), "ice crys");
  EXPECT_EQ(titlesOf(sets.at(0)), std::vector<std::string>{"snow"});
}

TEST_F(AnswersTest, TextsThatMatchNothingGetOneSetWithoutResults) {
  for (const std::string& typed :
       {std::string(), std::string(" "), std::string("qqqq"), std::string("\"* NEAR("),
        std::string("\xFF\xFE"), std::string("a\0b", 3), std::string(70'000, 'a')}) {
    SCOPED_TRACE(typed.substr(0, 20));
    const auto sets = search_.search(typed);
    ASSERT_EQ(sets.size(), 1U);
    EXPECT_TRUE(titlesOf(sets.at(0)).empty());
    EXPECT_EQ(validUtf8(json::serialize(sets)), json::serialize(sets));
  }
}

TEST_F(AnswersTest, ACountryShowsItsFlagInTheResultAndDeepInItsCard) {
  const auto sets = search_.search("france");
  const auto& result = sets.at(0).at("results").at(0);
  EXPECT_EQ(textAt(result.at("icon"), "url"), "https://localhost:1/image/flags/fr.png");
  const auto card = search_.card(std::stoll(textAt(result, "card_url").substr(28)));
  ASSERT_TRUE(card);
  EXPECT_EQ(card->at(0).at("sections").at(0).at("thumbnail"), result.at("icon"));
  EXPECT_EQ(card->at(0).at("sections").at(1).at("rows").at(0).at("value_image").at("id"), "fact");
  EXPECT_FALSE(search_.card(1 << 30));
}

TEST_F(AnswersTest, PagesFollowEachOtherWithoutGapsOrRepeats) {
  std::set<std::string> seen;
  std::size_t offset = 0;
  for (;; offset += 20) {
    const auto set = search_.more("zz", offset).at(0).get_object();
    for (const auto& title : titlesOf(set)) EXPECT_TRUE(seen.insert(title).second) << title;
    if (!set.contains("more_results_url")) break;
  }
  EXPECT_EQ(seen.size(), kListedOfKind);
  EXPECT_TRUE(titlesOf(search_.more("zz", 5000).at(0)).empty());
}

TEST_F(AnswersTest, LookupsSayWhenEachSenseFits) {
  const LookupAnswers lookup(index_.pool(), writer_);
  const auto sets = lookup.lookup("Snow");
  const auto& instructions = sets.at(0).at("results").at(0).at("lookup_instructions");
  EXPECT_EQ(instructions.at("min_keywords_score"), 0.0);
  EXPECT_EQ(instructions.at("keywords").at(0).at("word"), "precipitation");
  EXPECT_TRUE(titlesOf(lookup.lookup("qqqq").at(0)).empty());
}

TEST_F(AnswersTest, ZeroKeywordKnowsTheCountry) {
  const PopularAnswers popular(index_.pool(), writer_);
  EXPECT_EQ(titlesOf(popular.zeroKeyword("FR", 8).at(0)), std::vector<std::string>{"France"});
  EXPECT_TRUE(titlesOf(popular.zeroKeyword("ZZ", 8).at(0)).empty());
  for (int hour = 0; hour < 24; ++hour) EXPECT_GE(popularAt(hour).size(), 5U);
}

}  // namespace sandbox
