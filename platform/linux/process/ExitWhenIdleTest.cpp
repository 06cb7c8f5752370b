#include <gtest/gtest.h>

#include "platform/linux/process/ExitWhenIdle.h"
#include "platform/testing/ManualTimeline.h"

namespace zelkord {
namespace {

class ExitWhenIdleTest : public testing::Test {
 protected:
  ManualTimeline timeline_;
  CountedTransactions transactions_{timeline_};
  int exits_ = 0;
  ExitWhenIdle exit_{timeline_, timeline_, transactions_, 10s, [this] { ++exits_; }};
};

TEST_F(ExitWhenIdleTest, LeavesOnceAfterTheLimitWithoutAnyTransaction) {
  timeline_.advance(9s);
  EXPECT_EQ(exits_, 0);
  timeline_.advance(1s);
  EXPECT_EQ(exits_, 1);
  timeline_.advance(1h);
  EXPECT_EQ(exits_, 1);
}

TEST_F(ExitWhenIdleTest, CountsFromTheEndOfTheLastTransaction) {
  timeline_.advance(4s);
  transactions_.open("query").reset();  // until 14 s
  timeline_.advance(9s);
  EXPECT_EQ(exits_, 0);
  transactions_.open("query").reset();  // at 13 s, until 23 s
  timeline_.advance(9s);
  EXPECT_EQ(exits_, 0);
  timeline_.advance(1s);
  EXPECT_EQ(exits_, 1);
}

TEST_F(ExitWhenIdleTest, SleepsWhileATransactionStaysOpen) {
  auto open = transactions_.open("transfer");
  timeline_.advance(1h);
  EXPECT_EQ(timeline_.nextDelay(), std::nullopt);
  open.reset();
  EXPECT_EQ(timeline_.nextDelay(), 10s);
  timeline_.advance(10s);
  EXPECT_EQ(exits_, 1);
}

}  // namespace
}  // namespace zelkord
