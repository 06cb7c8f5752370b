#include <gtest/gtest.h>

#include "platform/api/Budget.h"
#include "platform/testing/FakeCounters.h"
#include "platform/testing/ManualTimeline.h"
#include "platform/testing/RecordingLog.h"

namespace zelkord {
namespace {

class BudgetTest : public testing::Test {
 protected:
  ManualTimeline timeline_;
  FakeCounters counters_;
  RecordingLog log_;
  LimitReports reports_{timeline_, counters_, Logger(log_, "limits")};
  Budget budget_{"places", {.inAll = 8, .ofOneHolder = 5}, reports_};

  std::int64_t refusals() { return counters_.value("com.quenta.zelkord.limit.places"); }
};

TEST_F(BudgetTest, NobodyHasMoreThanOneHolderMayAndAllTogetherNeverMoreThanThereIs) {
  auto five = budget_.take("pid 1", 5);
  ASSERT_TRUE(five);
  EXPECT_FALSE(budget_.take("pid 1"));
  const auto three = budget_.take("pid 2", 3);
  ASSERT_TRUE(three);
  EXPECT_FALSE(budget_.take("pid 2"));
  EXPECT_EQ(refusals(), 2);
  EXPECT_EQ(budget_.largestHolder(), "pid 1");
  five->reset();
  EXPECT_EQ(budget_.held(), 3u);
  EXPECT_TRUE(budget_.take("pid 2", 2));
}

TEST_F(BudgetTest, AShareGrowsOnlyWhereThereIsRoomAndIsGivenBackWhole) {
  {
    auto share = budget_.take("pid 1", 2);
    EXPECT_TRUE(share->resize(5));
    EXPECT_FALSE(share->resize(6));
    EXPECT_EQ(share->amount(), 5u);
    EXPECT_TRUE(share->resize(1));
    auto moved = std::move(*share);
    EXPECT_FALSE(*share);
    EXPECT_EQ(budget_.heldBy("pid 1"), 1u);
  }
  EXPECT_EQ(budget_.held(), 0u);
  EXPECT_EQ(budget_.largestHolder(), std::nullopt);
}

TEST_F(BudgetTest, WhoIsAloneMayHaveMoreAndKeepsItWhenOthersCome) {
  Budget rooms("rooms", Budget::halvedWhenAlone(16), reports_);
  auto eight = rooms.take("pid 1", 8);
  ASSERT_TRUE(eight);
  EXPECT_FALSE(rooms.take("pid 1"));
  const auto other = rooms.take("pid 2", 4);
  EXPECT_TRUE(other);
  EXPECT_FALSE(rooms.take("pid 2"));
  EXPECT_EQ(rooms.heldBy("pid 1"), 8u);
  EXPECT_TRUE(eight->resize(7));
  EXPECT_FALSE(eight->resize(8));
}

TEST_F(BudgetTest, AnAmountThatWouldOverflowIsRefused) {
  const auto one = budget_.take("pid 1");
  EXPECT_FALSE(budget_.take("pid 1", UINT64_MAX));
  EXPECT_EQ(budget_.held(), 1u);
}

TEST_F(BudgetTest, RefusalsAreOneLineAMinuteThatSaysHowMany) {
  for (int i = 0; i < 3; ++i) EXPECT_FALSE(budget_.take("pid 1", 9));
  timeline_.advance(std::chrono::seconds(61));
  EXPECT_FALSE(budget_.take("pid 2", 9));
  EXPECT_EQ(log_.texts("limits"),
            (std::vector<std::string>{
                "limit places reached by pid 1, 1 times since the last such line",
                "limit places reached by pid 2, 3 times since the last such line"}));
  EXPECT_EQ(refusals(), 4);
}

TEST_F(BudgetTest, AShareMayOutliveItsBudget) {
  std::optional<Budget::Share> share;
  {
    Budget brief("brief", Budget::quartered(8), reports_);
    EXPECT_FALSE(brief.take("pid 1", 3));
    share = brief.take("pid 1", 2);
  }
  EXPECT_TRUE(share->resize(1));
}

}  // namespace
}  // namespace zelkord
