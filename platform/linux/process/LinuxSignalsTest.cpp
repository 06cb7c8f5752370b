#include <gtest/gtest.h>
#include <signal.h>

#include "platform/linux/process/LinuxSignals.h"
#include "platform/linux/queues/LinuxWorkQueues.h"

namespace zelkord {
namespace {

class LinuxSignalsTest : public testing::Test {
 protected:
  LinuxClock clock_;
  LinuxWorkQueues queues_{clock_};
  const std::unique_ptr<SerialQueue> queue_ = queues_.makeSerialQueue("signals");
  const std::unique_ptr<Semaphore> came_ = queues_.makeSemaphore(0);
  LinuxSignals signals_;
};

TEST_F(LinuxSignalsTest, EachRaisedSignalRunsItsTasksOnTheirQueues) {
  const auto other = queues_.makeSemaphore(0);
  const auto task = [&] {
    queue_->assertCurrent();
    came_->signal();
  };
  const auto first = signals_.on(SIGUSR1, *queue_, task);
  const auto second = signals_.on(SIGUSR1, *queue_, task);
  const auto third = signals_.on(SIGUSR2, *queue_, [&] { other->signal(); });
  for (int round = 0; round < 3; ++round) {
    ::raise(SIGUSR1);
    EXPECT_TRUE(came_->wait(20s) && came_->wait(20s));
  }
  ::raise(SIGUSR2);
  EXPECT_TRUE(other->wait(20s));
  EXPECT_FALSE(came_->wait(0s));
}

TEST_F(LinuxSignalsTest, TheFormerDispositionReturnsWithTheEndOfTheLastSubscription) {
  struct sigaction ignore {};
  struct sigaction original {};
  ignore.sa_handler = SIG_IGN;
  ::sigaction(SIGUSR1, &ignore, &original);
  auto first = signals_.on(SIGUSR1, *queue_, [] { ADD_FAILURE() << "ran though cancelled"; });
  auto second = signals_.on(SIGUSR1, *queue_, [&] { came_->signal(); });
  first.reset();
  ::raise(SIGUSR1);
  EXPECT_TRUE(came_->wait(20s));
  second.reset();
  struct sigaction now {};
  ::sigaction(SIGUSR1, nullptr, &now);
  EXPECT_EQ(now.sa_handler, SIG_IGN);
  ::sigaction(SIGUSR1, &original, nullptr);
}

}  // namespace
}  // namespace zelkord
