#include <gtest/gtest.h>
#include <signal.h>
#include <unistd.h>

#include <atomic>
#include <thread>

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

// Every worker is busy for good, so that the task never runs.
TEST(LinuxSignalsDeathTest, TheProcessEndsInTimeWhateverItsTasksWaitFor) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  const auto leave = [](int signal) {
    LinuxClock clock;
    LinuxWorkQueues queues(clock, 2);
    LinuxSignals signals;
    signals.endProcessAfter(300ms, {SIGTERM});
    const auto task = [] { ::_exit(4); };
    const auto first = signals.on(SIGTERM, queues.global(QualityOfService::Default), task);
    const auto second = signals.on(SIGUSR1, queues.global(QualityOfService::Default), task);
    std::atomic<int> busy = 0;
    for (int i = 0; i < 2; ++i) {
      queues.global(QualityOfService::Default).async([&busy] {
        for (++busy;;) std::this_thread::sleep_for(1s);
      });
    }
    while (busy < 2) std::this_thread::yield();
    ::raise(signal);
    std::this_thread::sleep_for(2s);
    ::_exit(3);
  };
  EXPECT_EXIT(leave(SIGTERM), testing::ExitedWithCode(0), "");
  EXPECT_EXIT(leave(SIGUSR1), testing::ExitedWithCode(3), "");
}

}  // namespace
}  // namespace zelkord
