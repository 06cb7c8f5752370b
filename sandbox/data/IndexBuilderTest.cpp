#include <gtest/gtest.h>

#include <set>

#include "sandbox/TestData.h"
#include "sandbox/data/IndexBuilder.h"

namespace sandbox {

TEST(PrefixHeadsTest, ListsTheBestOfEachKindForCrowdedPrefixesOnly) {
  std::vector<Term> terms;
  for (int number = 0; number < 200; ++number)
    terms.push_back({"a" + std::to_string(1000 + number), number, number});
  for (int number = 0; number < 100; ++number)
    terms.push_back({"b" + std::to_string(1000 + number), number, number});
  terms.push_back({"a1", 900, -50, Kind::Country});
  std::set<std::string> prefixes;
  std::set<int> weights;
  bool countryListed = false;
  listPrefixHeads(terms, [&](std::string_view prefix, const Term& term) {
    prefixes.emplace(prefix);
    if (prefix != "a") return;
    if (term.kind == Kind::Country)
      countryListed = true;
    else
      weights.insert(term.weight);
  });
  EXPECT_EQ(prefixes, (std::set<std::string>{"a", "a1"}));
  EXPECT_EQ(weights.size(), kListedOfKind);
  EXPECT_EQ(*weights.begin(), 200 - static_cast<int>(kListedOfKind));
  EXPECT_TRUE(countryListed);
}

TEST(IndexBuilderTest, BuildsOnceUntilTheDataChanges) {
  const TemporaryFolder folder;
  const DataSources sources = writeTinyData(folder.path() / "data");
  const auto path = folder.path() / "index.db";
  EXPECT_TRUE(*IndexBuilder::ensure(sources, path));
  EXPECT_FALSE(*IndexBuilder::ensure(sources, path));
  writeTestFile(sources.isoCodes() / "iso_3166-1.json", "{}");
  EXPECT_TRUE(*IndexBuilder::ensure(sources, path));
}

TEST(IndexBuilderTest, ReplacesAFileThatIsNoIndexAndSurvivesMissingData) {
  const TemporaryFolder folder;
  const auto path = folder.path() / "index.db";
  writeTestFile(path, "this is no database, but long enough to be looked at as one");
  const DataSources nothing(folder.path() / "nowhere");
  EXPECT_EQ(nothing.missingPackages().size(), 4U);
  ASSERT_TRUE(IndexBuilder::ensure(nothing, path));
  SuggestionIndexPool pool(path);
  ASSERT_FALSE(pool.open());
  EXPECT_TRUE(pool.borrow()->startingWith("s").empty());
}

TEST(IndexBuilderTest, AFolderThatCannotBeWrittenIsAFailure) {
  const DataSources nothing("/nonexistent");
  EXPECT_FALSE(IndexBuilder::ensure(nothing, "/nonexistent/index.db"));
}

}  // namespace sandbox
