#include <gtest/gtest.h>

#include "sandbox/search/Match.h"

namespace sandbox {

namespace {

std::vector<std::int64_t> idsOf(const std::vector<Match>& matches) {
  std::vector<std::int64_t> ids;
  for (const auto& match : matches) ids.push_back(match.entry);
  return ids;
}

}  // namespace

TEST(MatchTest, LeavesRoomForOtherKindsWhenThereAreAny) {
  std::vector<Match> matches;
  for (int number = 0; number < 20; ++number)
    matches.push_back({"word", number, 1000 - number, Kind::Word});
  matches.push_back({"country", 100, -10, Kind::Country});
  matches.push_back({"character", 101, -20, Kind::Character});
  EXPECT_EQ(idsOf(pickMixed(matches, 8)), (std::vector<std::int64_t>{0, 1, 2, 3, 4, 5, 100, 101}));
  EXPECT_EQ(idsOf(pickAfter(matches, 8)),
            (std::vector<std::int64_t>{6, 7, 8, 9, 10, 11, 12, 13, 14, 15, 16, 17, 18, 19}));
  EXPECT_EQ(pickAfter(matches, 0).size(), matches.size());
  matches.push_back({"the country", 100, -30, Kind::Country});
  EXPECT_EQ(pickAfter(matches, 8).size(), 14U);
  matches.resize(20);
  EXPECT_EQ(idsOf(pickMixed(matches, 8)), (std::vector<std::int64_t>{0, 1, 2, 3, 4, 5, 6, 7}));
}

TEST(MatchTest, AnEntryFoundByTwoTextsCountsByItsBetterOne) {
  const auto picked = pickMixed({{"french republic", 1, 5}, {"france", 1, 9}, {"frame", 2, 7}}, 8);
  EXPECT_EQ(idsOf(picked), (std::vector<std::int64_t>{1, 2}));
  EXPECT_EQ(picked.front().text, "france");
}

TEST(MatchTest, CompletionsAreDifferentTexts) {
  const auto picked =
      pickCompletions({{"snow", 1, 9}, {"snow", 2, 8}, {"snowman", 3, 7}, {"snowy", 4, 6}}, 2);
  EXPECT_EQ(idsOf(picked), (std::vector<std::int64_t>{1, 3}));
}

}  // namespace sandbox
