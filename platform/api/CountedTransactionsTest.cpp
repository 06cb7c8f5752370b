#include <gtest/gtest.h>

#include "platform/api/CountedTransactions.h"
#include "platform/testing/ManualTimeline.h"

namespace zelkord {
namespace {

using Names = std::vector<std::string>;

TEST(CountedTransactionsTest, EachOpenOneIsNamedUntilItCloses) {
  ManualTimeline timeline;
  CountedTransactions transactions(timeline);
  auto flush = transactions.open("flush");
  {
    const auto query = transactions.open("query");
    const auto second = transactions.open("flush");
    EXPECT_EQ(transactions.openNames(), (Names{"flush", "flush", "query"}));
    EXPECT_EQ(transactions.idleSince(), std::nullopt);
  }
  EXPECT_EQ(transactions.openNames(), Names{"flush"});
  timeline.advance(3s);
  flush.reset();
  EXPECT_EQ(transactions.idleSince(), timeline.now());
}

TEST(CountedTransactionsTest, WhenIdleIsToldOnceAboutTheLastClosing) {
  ManualTimeline timeline;
  CountedTransactions transactions(timeline);
  int told = 0;
  auto first = transactions.open("a");
  auto second = transactions.open("b");
  transactions.whenIdle([&] {
    ++told;
    EXPECT_TRUE(transactions.openNames().empty());
  });
  first.reset();
  EXPECT_EQ(told, 0);
  second.reset();
  transactions.open("c").reset();
  EXPECT_EQ(told, 1);
}

TEST(CountedTransactionsTest, ATransactionMayOutliveTheRegister) {
  ManualTimeline timeline;
  Transaction kept;
  {
    CountedTransactions transactions(timeline);
    kept = transactions.open("late");
  }
  kept.reset();
}

}  // namespace
}  // namespace zelkord
