#include <gtest/gtest.h>

#include "zelkord/assembly/NotificationNames.h"
#include "zelkord/query/QueryCache.h"
#include "zelkord/query/QueryTestSupport.h"

namespace zelkord {
namespace {

class QueryCacheTest : public testing::Test {
 protected:
  QueryCacheTest() { cache_->start(); }

  struct Entry {
    std::string input;
    std::string query;
    double score = 0;
    double maxAge = 0;
    double scale = 0;
  };
  void store(const Entry& entry, std::string body = "[]") {
    store(*cache_, entry, std::move(body));
  }
  void store(QueryCache& cache, const Entry& entry, std::string body = "[]") {
    URLRequest request;
    if (entry.scale > 0) request.headers = {{"X-Quenta-UI-Scale", std::to_string(entry.scale)}};
    const json::object resultSet = {
        {"query", entry.query}, {"completion_score", entry.score}, {"max_age", entry.maxAge}};
    const auto response = std::make_shared<const FetchedResponse>(
        entry.input, request, "uuid", Data(std::move(body)), bed_.fakes.timeline.now());
    cache.set(CachedResultSet::Pointer(new CachedResultSet(response, resultSet)));
    bed_.fakes.timeline.runUntilIdle();
  }
  std::string found(const std::string& text, double scale = 0) {
    ZLKSearchRequest request;
    request.queryString = text;
    request.scale = scale;
    const auto entry = cache_->getRequest(request);
    return entry ? entry->query() : "none";
  }

  QueryBed bed_;
  const std::shared_ptr<QueryCache> cache_ = std::make_shared<QueryCache>(bed_.assembly);
};

TEST_F(QueryCacheTest, ChoosesTheShortestCompletionThenTheBestScore) {
  struct Case {
    const char* name;
    std::vector<Entry> entries;
    std::string text;
    std::string expected;
  };
  const std::vector<Case> cases = {
      {"a later keystroke", {{"a", "abc"}}, "ab", "abc"},
      {"nothing begins with it", {{"a", "abc"}}, "abcd", "none"},
      {"fetched for a longer text", {{"abc", "abc"}}, "ab", "none"},
      {"case does not matter", {{"A", "ABC"}}, "aB", "abc"},
      {"score decides between equals", {{"a", "abc", 0.2}, {"a", "abd", 0.9}}, "ab", "abd"},
      {"length comes before score", {{"a", "abc", 0.1}, {"a", "abcd", 0.9}}, "ab", "abc"},
      {"a score of zero or less never wins", {{"a", "abc", -0.9}, {"a", "abd", -0.1}}, "ab", "abc"},
      {"nor does it keep a better one out", {{"a", "abc", -0.9}, {"a", "abd", 0.1}}, "ab", "abd"},
      {"the first of equal scores", {{"a", "abd", 0.5}, {"a", "abc", 0.5}}, "ab", "abc"},
      {"input longer than query is refused", {{"abcd", "abc"}}, "abc", "none"},
      {"no query", {{"", ""}}, "", "none"},
      {"a zero character in the query", {{"a", std::string("ab\0c", 4)}}, "a", "none"},
  };
  for (const auto& wanted : cases) {
    SCOPED_TRACE(wanted.name);
    cache_->removeAllObjects();
    for (const auto& entry : wanted.entries) store(entry);
    EXPECT_EQ(found(wanted.text), wanted.expected);
  }
}

TEST_F(QueryCacheTest, LogsOnlyTheEntriesThatItChoosesAmong) {
  for (const auto* query : {"abcd", "abc", "abd", "xyz"}) store({"a", query});
  store({"abcde", "abcde"});  // fetched for a longer text
  bed_.fakes.log.clear();
  EXPECT_EQ(found("ab"), "abc");
  EXPECT_EQ(bed_.fakes.log.count(LogLevel::Debug), 3);  // the lookup, "abc", "abd"
}

TEST_F(QueryCacheTest, UsesAnEntryOnlyAtItsScale) {
  store({"a", "abc", 0, 0, 3});
  EXPECT_EQ(found("a", 2), "none");
  EXPECT_EQ(found("a", 3), "abc");
  EXPECT_EQ(found("a", 0), "abc");
}

TEST_F(QueryCacheTest, DropsAnEntryOnceItIsTooOld) {
  store({"a", "abc", 0, 10});
  bed_.fakes.timeline.advance(9s);
  EXPECT_EQ(found("a"), "abc");
  bed_.fakes.timeline.advance(1s);
  EXPECT_EQ(found("a"), "none");
  EXPECT_EQ(cache_->count(), 0u);
}

TEST_F(QueryCacheTest, StaysNonEmptyWhenTheLastEntryExpires) {
  store({"a", "abc", 0, 10});
  bed_.fakes.timeline.advance(10s);
  EXPECT_EQ(found("a"), "none");
  EXPECT_EQ(bed_.fakes.transactions.openNames().size(), 1u);
  store({"a", "abc"});
  EXPECT_EQ(bed_.fakes.transactions.openNames().size(), 1u);
  EXPECT_EQ(bed_.fakes.memoryPressure.sourceCount(), 1u);
}

TEST_F(QueryCacheTest, KeepsWithinItsBudget) {
  constexpr std::size_t kLargest = 2'097'152 - 1'024 - 1;
  store({"a", "abc"}, std::string(kLargest + 1, 'x'));
  EXPECT_EQ(cache_->count(), 0u);
  store({"a", "abc"}, std::string(kLargest, 'x'));
  EXPECT_EQ(cache_->count(), 1u);
  store({"b", "bcd"});  // would exceed: everything else goes
  EXPECT_EQ(found("a"), "none");
  EXPECT_EQ(found("b"), "bcd");
}

TEST_F(QueryCacheTest, AChargeThatReachesTheLimitEmptiesIt) {
  constexpr std::size_t kHalf = 2'097'152 / 2 - 1'024;
  for (const bool reaches : {false, true}) {
    cache_->removeAllObjects();
    store({"a", "abc"}, std::string(kHalf, 'x'));
    store({"b", "bcd"}, std::string(reaches ? kHalf : kHalf - 1, 'x'));
    EXPECT_EQ(cache_->count(), reaches ? 1u : 2u);
  }
  EXPECT_TRUE(bed_.fakes.log.contains("!!! exceeded max cost, flushing cache !!!"));
}

TEST_F(QueryCacheTest, AllCachesTogetherKeepWithinTheirs) {
  const auto bytes =
      std::make_shared<Budget>("bytes", Budget::Size{3'000'000, 2'000'000}, bed_.assembly.limits());
  std::vector<std::shared_ptr<QueryCache>> caches;
  for (const auto* holder : {"pid 1", "pid 1", "pid 2"}) {
    caches.push_back(std::make_shared<QueryCache>(bed_.assembly, bytes));
    caches.back()->setHolder(holder);
  }
  const std::string large(900'000, 'x');
  store(*caches[0], {"a", "abc"}, large);
  store(*caches[0], {"b", "bcd"}, large);
  store(*caches[1], {"a", "abc"}, large);
  EXPECT_EQ(caches[1]->count(), 0u);  // it has nothing to give
  store(*caches[2], {"a", "abc"}, large);
  EXPECT_EQ(caches[2]->count(), 1u);
  store(*caches[0], {"c", "cde"}, std::string(200'000, 'x'));
  EXPECT_EQ(caches[0]->count(), 1u);  // emptied for the new one
  store(*caches[1], {"a", "abc"}, large);
  EXPECT_EQ(caches[1]->count(), 1u);

  // What has expired gives its room back too.
  caches[2]->removeAllObjects();
  store(*caches[2], {"a", "abc", 0, 10}, large);
  bed_.fakes.timeline.advance(11s);
  caches[2]->get("a");
  store(*caches[2], {"b", "bcd"}, std::string(1'500'000, 'x'));
  EXPECT_EQ(caches[2]->count(), 1u);
  caches.clear();
  EXPECT_EQ(bytes->held(), 0u);
}

TEST_F(QueryCacheTest, AReplacedEntrysChargeStays) {
  const std::string half(1'000'000, 'x');
  store({"a", "abc"}, half);
  store({"a", "abc"}, half);
  store({"b", "bcd"}, half);
  EXPECT_EQ(cache_->count(), 1u);
  EXPECT_EQ(found("b"), "bcd");
}

TEST_F(QueryCacheTest, IsEmptiedByWhatChangesResults) {
  for (const auto name : {kZLKUserGUIDChangeNotification, kZLKSessionSoftLimitNotification,
                          kZLKSessionMaxLimitNotification, kCountryCodeChanged, kTimeZoneChanged,
                          kCurrentLocaleChanged, kEffectiveRestrictionsChanged}) {
    SCOPED_TRACE(name);
    store({"a", "abc"});
    ASSERT_EQ(cache_->count(), 1u);
    bed_.fakes.notificationCenter.post(std::string(name));
    bed_.fakes.timeline.runUntilIdle();
    EXPECT_EQ(cache_->count(), 0u);
  }
}

TEST_F(QueryCacheTest, HoldsATransactionWhileItHoldsEntries) {
  EXPECT_TRUE(bed_.fakes.transactions.openNames().empty());
  store({"a", "abc"});
  store({"b", "bcd"});
  EXPECT_EQ(bed_.fakes.transactions.openNames(), std::vector<std::string>{"queryCache"});
  EXPECT_EQ(bed_.fakes.memoryPressure.sourceCount(), 1u);
  bed_.fakes.memoryPressure.raise();
  bed_.fakes.timeline.runUntilIdle();
  EXPECT_EQ(cache_->count(), 0u);
  EXPECT_TRUE(bed_.fakes.transactions.openNames().empty());
  EXPECT_EQ(bed_.fakes.memoryPressure.sourceCount(), 0u);
}

}  // namespace
}  // namespace zelkord
