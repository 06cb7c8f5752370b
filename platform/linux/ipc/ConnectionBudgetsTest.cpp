#include <gtest/gtest.h>

#include <algorithm>
#include <map>
#include <memory>
#include <optional>
#include <utility>
#include <vector>

#include "platform/linux/ipc/CallFlow.h"
#include "platform/linux/ipc/ConnectionBudgets.h"
#include "platform/testing/FakeCounters.h"
#include "platform/testing/ManualTimeline.h"
#include "platform/testing/RecordingLog.h"

namespace zelkord::ipc {
namespace {

class ConnectionBudgetsTest : public testing::Test {
 protected:
  struct Socket {
    Budget::Share share;
    Subscription waiting;  // then: open
    pid_t pid = 0;
  };
  // Accepts a socket of that process; false when there is no place.
  bool accept(pid_t pid) {
    auto share = budgets_.take(pid);
    if (!share) return false;
    const int number = ++last_;
    auto& socket = sockets_[number];
    socket.share = *std::move(share);
    socket.waiting = budgets_.awaitAuthentication(pid, [this, number] { leave(number); });
    socket.pid = pid;
    return true;
  }
  void authenticateAll() {
    for (auto& [number, socket] : sockets_) {
      socket.waiting = budgets_.holdOpen(socket.pid, [this, number = number] { leave(number); });
    }
  }
  void leave(int number) {
    left_.push_back(number);
    sockets_.erase(number);
  }
  std::vector<int> left() { return std::exchange(left_, {}); }

  ManualTimeline timeline_;
  FakeCounters counters_;
  RecordingLog log_;
  LimitReports reports_{timeline_, counters_, Logger(log_, "limits")};
  // 16 connections, 4 of a process, 8 of one that is alone; 8 of them unauthenticated.
  ConnectionBudgets budgets_{ConnectionBudgets::sizeFor(32), reports_};
  std::map<int, Socket> sockets_;
  std::vector<int> left_;
  int last_ = 0;
};

TEST_F(ConnectionBudgetsTest, TheOldestUnauthenticatedOfAProcessMakesRoomForItsNext) {
  for (int i = 1; i <= 8; ++i) EXPECT_TRUE(accept(1));
  EXPECT_TRUE(left().empty());
  EXPECT_TRUE(accept(1));
  EXPECT_TRUE(accept(1));
  EXPECT_EQ(left(), (std::vector<int>{1, 2}));
  authenticateAll();
  EXPECT_FALSE(accept(1));
  EXPECT_TRUE(accept(2));
  EXPECT_TRUE(left().empty());
  EXPECT_EQ(counters_.value("com.quenta.zelkord.limit.connections"), 3);
}

TEST_F(ConnectionBudgetsTest, WhoHasMostUnauthenticatedMakesRoomForOthers) {
  EXPECT_TRUE(accept(2));
  for (int i = 0; i < 7; ++i) accept(1);  // not alone, so four at most
  EXPECT_EQ(left(), (std::vector<int>{2, 3, 4}));
  for (const pid_t pid : {3, 4, 5}) EXPECT_TRUE(accept(pid));
  EXPECT_TRUE(left().empty());
  EXPECT_TRUE(accept(6));
  EXPECT_EQ(left(), (std::vector<int>{5}));
}

TEST_F(ConnectionBudgetsTest, WhenEveryPlaceIsTakenAnUnauthenticatedOneGoes) {
  for (const pid_t pid : {1, 1, 2, 2, 3, 3, 4, 4, 1, 2, 3, 4}) {
    EXPECT_TRUE(accept(pid));
    authenticateAll();
  }
  for (const pid_t pid : {5, 5, 6, 6}) EXPECT_TRUE(accept(pid));
  EXPECT_TRUE(accept(7));
  EXPECT_EQ(left().size(), 1u);
  authenticateAll();
  EXPECT_FALSE(accept(8));
}

TEST_F(ConnectionBudgetsTest, WhoHasItsShareMakesRoomForItsNextByItself) {
  for (const pid_t pid : {1, 1, 2, 2, 3, 3, 4, 4, 1, 1}) {
    EXPECT_TRUE(accept(pid));
    authenticateAll();
  }
  for (const pid_t pid : {2, 2, 3, 3, 4, 4}) EXPECT_TRUE(accept(pid));
  EXPECT_FALSE(accept(1));  // it has nothing but open ones
  EXPECT_TRUE(left().empty());
  EXPECT_TRUE(accept(4));
  EXPECT_TRUE(accept(5));
  EXPECT_EQ(left(), (std::vector<int>{15, 11})) << "its own; among equals, the oldest";
}

TEST_F(ConnectionBudgetsTest, WhoKeptMoreThanItsShareMakesRoomForNewcomers) {
  for (int i = 0; i < 8; ++i) EXPECT_TRUE(accept(1));
  authenticateAll();
  for (const pid_t pid : {2, 2, 2, 2, 3, 3, 3, 3}) EXPECT_TRUE(accept(pid));
  authenticateAll();
  for (const pid_t pid : {4, 4, 5, 5}) EXPECT_TRUE(accept(pid));
  EXPECT_EQ(left(), (std::vector<int>{8, 7, 6, 5})) << "its newest, down to its share";
  authenticateAll();
  EXPECT_FALSE(accept(6));
  EXPECT_TRUE(left().empty());
}

// A connection that holds what a test says.
class TestHolder final : public ClientMemory::Holder {
 public:
  TestHolder(std::shared_ptr<ClientMemory> memory, pid_t pid)
      : memory_(std::move(memory)),
        calls_(std::make_shared<CallFlow>(100, 100'000, memory_, pid)),
        registration_(memory_->add(*this)) {}
  ~TestHolder() override { cutOffForMemory(); }

  void hold(std::size_t bytes) {
    held_ += bytes;
    calls_->process().add(bytes);
    memory_->grew(calls_->process());
  }
  bool isCutOff() const { return !registration_; }

  const std::shared_ptr<CallFlow>& calls() const override { return calls_; }
  std::size_t messageBytes() const override { return held_; }
  std::size_t largestMessage() const override { return held_; }
  void cutOffForMemory() override {
    registration_.reset();
    calls_->process().remove(std::exchange(held_, 0));
  }

 private:
  const std::shared_ptr<ClientMemory> memory_;
  const std::shared_ptr<CallFlow> calls_;
  std::size_t held_ = 0;
  Subscription registration_;
};

class ClientMemoryTest : public testing::Test {
 protected:
  ManualTimeline timeline_;
  FakeCounters counters_;
  RecordingLog log_;
  LimitReports reports_{timeline_, counters_, Logger(log_, "limits")};
  const std::shared_ptr<ClientMemory> memory_ = std::make_shared<ClientMemory>(
      ClientMemory::Size{.inAll = 400'000, .ofOneProcess = 100'000, .callsOfOneProcess = 3},
      reports_);
};

TEST_F(ClientMemoryTest, TheLargestConnectionOfAProcessThatHasTooMuchIsCutOff) {
  TestHolder small(memory_, 1), large(memory_, 1), other(memory_, 2);
  other.hold(10'000);
  large.hold(250'000);  // one message may be larger than what a process may hold
  EXPECT_TRUE(small.calls()->take(90'000));
  small.hold(90'000);
  EXPECT_FALSE(large.isCutOff());
  small.hold(11'000);
  EXPECT_TRUE(large.isCutOff());
  EXPECT_FALSE(small.isCutOff() || other.isCutOff());
  EXPECT_EQ(memory_->held(), 111'000u);
  EXPECT_EQ(counters_.value("com.quenta.zelkord.limit.client_memory"), 1);
}

TEST_F(ClientMemoryTest, WhenAllHoldTooMuchTheLargestProcessLosesItsLargestConnection) {
  TestHolder first(memory_, 1), second(memory_, 1), third(memory_, 2), fourth(memory_, 3);
  first.hold(60'000);
  second.hold(80'000);
  third.hold(130'000);
  fourth.hold(120'000);
  EXPECT_EQ(memory_->held(), 390'000u);
  fourth.hold(15'000);
  EXPECT_TRUE(second.isCutOff());
  EXPECT_FALSE(first.isCutOff() || third.isCutOff() || fourth.isCutOff());
}

TEST_F(ClientMemoryTest, WhatIsLeftOfAConnectionThatWasCutOffCostsNobodyElseTheirs) {
  TestHolder first(memory_, 1), second(memory_, 2), third(memory_, 3), fourth(memory_, 4);
  auto kept = first.calls()->take(90'000);
  ASSERT_TRUE(kept);
  first.hold(60'000);
  for (auto* holder : {&second, &third}) holder->hold(120'000);
  fourth.hold(70'000);
  EXPECT_TRUE(first.isCutOff());
  fourth.hold(10'000);
  EXPECT_FALSE(second.isCutOff() || third.isCutOff() || fourth.isCutOff());
  EXPECT_FALSE(fourth.calls()->take(15'000));
  kept.reset();
  EXPECT_TRUE(fourth.calls()->take(10'000));
  EXPECT_EQ(memory_->held(), 320'000u);
}

TEST_F(ClientMemoryTest, WhatIsLeftOfConnectionsThatWereCutOffIsBoundedToo) {
  std::vector<std::unique_ptr<TestHolder>> small, large;
  std::vector<std::optional<CallFlow::Share>> kept;
  for (const pid_t pid : {1, 2, 3}) {
    TestHolder cutOff(memory_, pid);
    kept.push_back(cutOff.calls()->take(90'000));
    cutOff.hold(10'000);
    small.push_back(std::make_unique<TestHolder>(memory_, pid));
    small.back()->hold(10'000);
    EXPECT_TRUE(cutOff.isCutOff());
  }
  for (const pid_t pid : {4, 5, 6, 7, 8}) {
    large.push_back(std::make_unique<TestHolder>(memory_, pid));
    large.back()->hold(40'000);
    EXPECT_LE(memory_->held(), 500'000u);
  }
  const auto isCutOff = [](const auto& holder) { return holder->isCutOff(); };
  EXPECT_EQ(std::ranges::count_if(large, isCutOff), 1);
  EXPECT_EQ(std::ranges::count_if(small, isCutOff), 0);
}

TEST_F(ClientMemoryTest, CallsThatDoNotFitAreRefused) {
  TestHolder one(memory_, 1), two(memory_, 1), other(memory_, 2);
  std::vector<std::optional<CallFlow::Share>> kept;
  EXPECT_FALSE(one.calls()->take(100'000));
  for (auto* holder : {&one, &two, &one}) kept.push_back(holder->calls()->take(1000));
  EXPECT_TRUE(kept.back());
  EXPECT_FALSE(two.calls()->take(1));
  EXPECT_TRUE(other.calls()->take(1));
  kept.clear();
  EXPECT_TRUE(two.calls()->take(1));
  EXPECT_EQ(counters_.value("com.quenta.zelkord.limit.calls"), 2);
  EXPECT_EQ(memory_->held(), 0u);
}

}  // namespace
}  // namespace zelkord::ipc
