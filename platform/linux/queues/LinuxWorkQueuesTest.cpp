#include <gtest/gtest.h>

#include <atomic>
#include <future>
#include <latch>
#include <memory>
#include <thread>
#include <vector>

#include "platform/linux/queues/LinuxWorkQueues.h"
#include "platform/linux/queues/QueueCore.h"

// The real queues: workers, qualities, clock rate. Races are for ThreadSanitizer to find.

namespace zelkord {
namespace {

class LinuxWorkQueuesTest : public testing::Test {
 protected:
  bool eventually(FunctionRef<bool()> done) {
    const auto deadline = clock_.realNow() + 20s;
    while (!done() && clock_.realNow() < deadline) std::this_thread::yield();
    return done();
  }
  // Runs `body(i)` on so many threads at once.
  static void onThreads(int count, const std::function<void(int)>& body) {
    std::vector<std::thread> threads;
    for (int i = 0; i < count; ++i) threads.emplace_back(body, i);
    for (auto& thread : threads) thread.join();
  }

  LinuxClock clock_;
  LinuxWorkQueues queues_{clock_, 2};
};

TEST_F(LinuxWorkQueuesTest, WaitersOfOneSecondAreAllAnsweredAboutThen) {
  constexpr int kWaiters = 64;
  const auto never = queues_.makeSemaphore(0);
  std::vector<std::unique_ptr<SerialQueue>> waiters;
  std::atomic<int> answered = 0;
  const auto start = clock_.realNow();
  for (int i = 0; i < kWaiters; ++i) {
    waiters.push_back(queues_.makeSerialQueue("waiter"));
    waiters.back()->async([&] {
      EXPECT_FALSE(never->wait(500ms));
      ++answered;
    });
  }
  EXPECT_TRUE(eventually([&] { return answered == kWaiters; }));
  EXPECT_LT(clock_.realNow() - start, 10s);  // two at a time would take 16 s
}

TEST_F(LinuxWorkQueuesTest, NineHundredWaitersAreAnsweredInTimeAndDelayNobody) {
  constexpr int kWaiters = 900;
  const auto never = queues_.makeSemaphore(0);
  std::vector<std::unique_ptr<SerialQueue>> waiters;
  std::atomic<int> answered = 0;
  const auto start = clock_.realNow();
  for (int i = 0; i < kWaiters; ++i) {
    waiters.push_back(queues_.makeSerialQueue("waiter"));
    waiters.back()->async([&] {
      EXPECT_FALSE(never->wait(3s));
      ++answered;
    });
  }
  EXPECT_TRUE(eventually([&] { return queues_.workers().blocked == kWaiters; }));
  std::atomic<bool> served = false;
  const auto other = queues_.makeSerialQueue("other");
  other->async([&] { served = true; });
  EXPECT_TRUE(eventually([&] { return served.load(); }));
  EXPECT_EQ(answered, 0);
  EXPECT_TRUE(eventually([&] { return answered == kWaiters; }));
  EXPECT_LT(clock_.realNow() - start, 5900ms);  // those that find no worker begin after 3 s
}

TEST_F(LinuxWorkQueuesTest, AWaitTooManyEndsAtOnceAndIsReported) {
  constexpr int kWaiters = WorkerPool::kMaximumWaiting;
  constexpr int kTooMany = 200;
  std::atomic<int> refused = 0, reported = 0;
  queues_.onRefusedWait([&] { ++reported; });
  const auto gate = queues_.makeSemaphore(0);
  const auto group = queues_.makeGroup();
  group->enter();
  std::vector<std::unique_ptr<SerialQueue>> waiters;
  for (int i = 0; i < kWaiters + kTooMany; ++i) {
    waiters.push_back(queues_.makeSerialQueue("waiter"));
    waiters.back()->async([&, i] {
      if (!(i % 2 == 0 ? gate->wait(20s) : group->wait(20s))) ++refused;
    });
  }
  EXPECT_TRUE(eventually([&] { return refused == kTooMany; }));
  EXPECT_EQ(reported, kTooMany);
  EXPECT_EQ(queues_.workers().blocked, WorkerPool::kMaximumWaiting);
  EXPECT_FALSE(gate->wait(1ms));  // whoever is no worker may wait as before
  bool ran = false;
  const auto other = queues_.makeSerialQueue("other");
  other->async([&] { ran = true; });
  other->sync([&] { EXPECT_TRUE(ran); });
  group->leave();
  gate->signal(kWaiters);
  EXPECT_TRUE(eventually([&] { return queues_.workers().blocked == 0; }));
}

TEST_F(LinuxWorkQueuesTest, WaitersLeaveWorkersToOthers) {
  constexpr int kWaiters = 64;
  const auto gate = queues_.makeSemaphore(0);
  std::vector<std::unique_ptr<SerialQueue>> waiters;
  for (int i = 0; i < kWaiters; ++i) {
    waiters.push_back(queues_.makeSerialQueue("waiter"));
    waiters.back()->async([&] { EXPECT_TRUE(gate->wait(20s)); });
  }
  EXPECT_TRUE(eventually([&] { return queues_.workers().blocked == kWaiters; }));
  bool ran = false;
  const auto other = queues_.makeSerialQueue("other");
  other->async([&] { ran = true; });
  other->sync([&] { EXPECT_TRUE(ran); });
  gate->signal(kWaiters);
}

TEST_F(LinuxWorkQueuesTest, SyncThatWaitsForAnotherQueueIsCompensated) {
  const auto slow = queues_.makeSerialQueue("slow");
  const auto gate = queues_.makeSemaphore(0);
  std::atomic<int> through = 0;
  slow->async([&] { EXPECT_TRUE(gate->wait(20s)); });
  for (int i = 0; i < 8; ++i) {
    queues_.global(QualityOfService::High).async([&] { slow->sync([&] { ++through; }); });
  }
  queues_.global(QualityOfService::Background).async([&] { gate->signal(); });
  EXPECT_TRUE(eventually([&] { return through == 8; }));
}

TEST_F(LinuxWorkQueuesTest, HigherQualitiesGoFirstAndBackgroundStillGetsItsTurn) {
  std::atomic<int> begun = 0, ended = 0;
  std::atomic<bool> open = false;
  for (int i = 0; i < 2; ++i) {  // both workers are busy, not blocked
    queues_.global(QualityOfService::High).async([&] {
      ++begun;
      while (!open) std::this_thread::yield();
      ++ended;
    });
  }
  EXPECT_TRUE(eventually([&] { return begun == 2; }));

  constexpr int kHigh = 200;
  std::atomic<int> high = 0, highBeforeLow = -1;
  std::atomic<bool> lowDone = false;
  queues_.global(QualityOfService::Background).async([&] {
    highBeforeLow = high.load();
    lowDone = true;
  });
  for (int i = 0; i < kHigh; ++i) {
    queues_.global(QualityOfService::High).async([&] { ++high; });
  }
  open = true;
  EXPECT_TRUE(eventually([&] { return lowDone && high == kHigh && ended == 2; }));
  EXPECT_GT(highBeforeLow, 0);
  EXPECT_LT(highBeforeLow, kHigh);
}

// One of the two workers, kept from everything else until it is let go.
class BusyWorker {
 public:
  explicit BusyWorker(LinuxWorkQueues& queues) {
    queues.global(QualityOfService::High).async([this] {
      begun_ = true;
      while (!over_) std::this_thread::yield();
      ended_ = true;
    });
    while (!begun_) std::this_thread::yield();
  }
  ~BusyWorker() {
    over_ = true;
    while (!ended_) std::this_thread::yield();
  }

 private:
  std::atomic<bool> begun_ = false, over_ = false, ended_ = false;
};

TEST_F(LinuxWorkQueuesTest, AQueueOfLongTasksLetsOthersHaveTheirTurn) {
  const BusyWorker other(queues_);
  const auto slow = queues_.makeSerialQueue("slow");
  const auto quick = queues_.makeSerialQueue("quick");
  std::atomic<int> slowDone = 0, slowBefore = -1;
  slow->async([&] { quick->async([&] { slowBefore = slowDone.load(); }); });
  for (int i = 0; i < 16; ++i) {
    slow->async([&] {
      std::this_thread::sleep_for(1ms);
      ++slowDone;
    });
  }
  EXPECT_TRUE(eventually([&] { return slowDone == 16 && slowBefore >= 0; }));
  EXPECT_LE(slowBefore, 2);
}

TEST_F(LinuxWorkQueuesTest, AQueueThatBecomesLessUrgentWaitsBehindOthers) {
  const BusyWorker other(queues_);
  const auto demoted = queues_.makeSerialQueue("demoted", QualityOfService::High);
  const auto ordinary = queues_.makeSerialQueue("ordinary");
  demoted->setQuality(QualityOfService::Background);
  std::atomic<int> ordinaryDone = 0, ordinaryBefore = -1;
  ordinary->async([&] {
    demoted->async([&] { ordinaryBefore = ordinaryDone.load(); });
    for (int i = 0; i < 4; ++i) {
      ordinary->async([&] {
        std::this_thread::sleep_for(1ms);
        ++ordinaryDone;
      });
    }
  });
  EXPECT_TRUE(eventually([&] { return ordinaryBefore >= 0; }));
  EXPECT_EQ(ordinaryBefore, 4);
}

TEST_F(LinuxWorkQueuesTest, LongBackgroundWorkLeavesAWorkerFree) {
  std::atomic<bool> open = false;
  std::atomic<int> ended = 0;
  for (int i = 0; i < 4; ++i) {
    queues_.global(QualityOfService::Background).async([&] {
      while (!open) std::this_thread::yield();
      ++ended;
    });
  }
  std::atomic<bool> served = false;
  queues_.global(QualityOfService::Default).async([&] { served = true; });
  EXPECT_TRUE(eventually([&] { return served.load(); }));
  open = true;
  EXPECT_TRUE(eventually([&] { return ended == 4; }));
}

TEST(WorkerPoolTest, IdleWorkersLeaveButForOne) {
  LinuxClock clock;
  const auto pool = std::make_shared<WorkerPool>(4, 20ms);
  std::atomic<int> begun = 0;
  auto core = std::make_shared<QueueCore>(pool, "many", QualityOfService::Default);
  for (int i = 0; i < 4; ++i) {
    core->async(QueueCore::Access::Shared, [&] {
      ++begun;
      while (begun < 4) std::this_thread::yield();
    });
  }
  const auto deadline = clock.realNow() + 20s;
  while (begun < 4 || pool->counts().total > 1 || pool->counts().running > 0) {
    ASSERT_LT(clock.realNow(), deadline);
    std::this_thread::yield();
  }
  bool ran = false;
  core->async(QueueCore::Access::Exclusive, [&] { ran = true; });
  core->sync(QueueCore::Access::Exclusive, [&] { EXPECT_TRUE(ran); });
  pool->stop();
}

TEST_F(LinuxWorkQueuesTest, OnlyScaledDelaysFollowTheClockRate) {
  const LinuxClock fast(1000);
  LinuxWorkQueues queues(fast);
  const auto queue = queues.makeSerialQueue("serial");
  const auto done = queues.makeSemaphore(0);
  const auto start = fast.now();
  const auto wallStart = fast.wallNow();
  const auto realStart = fast.realNow();
  const auto scaled = queue->after(30s, [&] { done->signal(); });
  EXPECT_TRUE(done->wait(20s));
  EXPECT_GE(fast.now() - start, 29s);
  EXPECT_GE(fast.wallNow() - wallStart, 29s);
  EXPECT_LT(fast.realNow() - realStart, 20s);

  const auto realFrom = fast.realNow();
  const auto real = queue->after(
      20ms, [&] { done->signal(); }, TimeBase::Real);
  EXPECT_TRUE(done->wait(20s));
  EXPECT_GE(fast.realNow() - realFrom, 20ms);
}

TEST_F(LinuxWorkQueuesTest, TheMainQueueRunsOnTheThreadOfTheMainLoop) {
  std::thread::id where;
  queues_.main().async([&] { where = std::this_thread::get_id(); });
  const auto later = queues_.main().after(1ms, [&] { queues_.stopMainLoop(); });
  queues_.runMainLoop();
  EXPECT_EQ(where, std::this_thread::get_id());
}

TEST_F(LinuxWorkQueuesTest, ExclusiveAccessHoldsUnderContention) {
  const auto serial = queues_.makeSerialQueue("serial");
  const auto concurrent = queues_.makeConcurrentQueue("concurrent");
  int counter = 0;  // the serial queue's
  int value = 0;    // written in barriers

  onThreads(4, [&](int thread) {
    for (int i = 0; i < 512; ++i) {
      if (i % 3 == 0) {
        serial->async([&] { ++counter; });
      } else {
        serial->sync([&] { ++counter; });
      }
      if (i % 16 == thread) {
        concurrent->barrierSync([&] { ++value; });
      } else if (i % 16 == thread + 4) {
        concurrent->barrierAsync([&] { ++value; });
      } else {
        concurrent->sync([&] { EXPECT_GE(value, 0); });
      }
    }
  });
  serial->sync([&] { EXPECT_EQ(counter, 4 * 512); });
  concurrent->barrierSync([&] { EXPECT_EQ(value, 4 * 2 * 512 / 16); });
}

TEST_F(LinuxWorkQueuesTest, DestructionMayMeetWorkFromOtherThreads) {
  for (int round = 0; round < 50; ++round) {
    auto queue = queues_.makeConcurrentQueue("short");
    int value = 0;
    std::vector<Subscription> delayed;
    for (int i = 0; i < 8; ++i) {
      queue->async([&] { EXPECT_GE(value, 0); });
      queue->barrierAsync([&] { ++value; });
      delayed.push_back(
          queue->after(std::chrono::microseconds(i * 20), [&] { EXPECT_GE(value, 0); }));
    }
    if (round % 2 == 0) queue->sync([] {});
    onThreads(2, [&](int half) {
      for (std::size_t i = 0; i < 4; ++i) delayed[static_cast<std::size_t>(half) * 4 + i].reset();
    });
    queue.reset();
    value = -1;  // nothing may run any more
  }
}

TEST(LinuxWorkQueuesEndTest, WhatRunsAtTheEndMayWaitForAQueueWhoseTaskIsDropped) {
  LinuxClock clock;
  auto queues = std::make_unique<LinuxWorkQueues>(clock, 2);
  const auto waitedFor = queues->makeSerialQueue("waited for");
  const std::unique_ptr<SerialQueue> busy[] = {queues->makeSerialQueue("busy"),
                                               queues->makeSerialQueue("busy too")};
  std::latch begun(2), release(1);
  std::atomic<bool> entered = false;
  std::promise<void> dropped;
  for (const auto& queue : busy) {
    queue->async([&] {
      begun.count_down();
      release.wait();
      waitedFor->sync([&] { entered = true; });
    });
  }
  begun.wait();
  waitedFor->async([told = std::shared_ptr<void>(nullptr, [&](void*) { dropped.set_value(); })] {});
  std::thread end([&] { queues.reset(); });
  EXPECT_EQ(dropped.get_future().wait_for(20s), std::future_status::ready);
  release.count_down();
  end.join();
  EXPECT_TRUE(entered);
}

TEST_F(LinuxWorkQueuesTest, TimersMayBeArmedCancelledAndDestroyedWhileTheyFire) {
  const auto queue = queues_.makeSerialQueue("serial");
  std::atomic<int> fired = 0;
  onThreads(3, [&](int thread) {
    for (int round = 0; round < 60; ++round) {
      const auto alive = std::make_shared<int>();
      const auto timer =
          queues_.makeTimer(*queue, [&fired, weak = std::weak_ptr(alive)] { ++fired; });
      for (int i = 0; i < 10; ++i) {
        timer->arm(std::chrono::microseconds(10 * ((i + thread) % 5)), 20us);
        if (i % 4 == 3) timer->cancel();
        std::this_thread::yield();
      }
    }
  });
  std::atomic<bool> last = false;
  const auto timer = queues_.makeTimer(*queue, [&] { last = true; });
  timer->arm(1ms, 0s);
  EXPECT_TRUE(eventually([&] { return last.load(); }));
}

TEST_F(LinuxWorkQueuesTest, SignalsAndWaitsMeetWithoutLosingAny) {
  const auto semaphore = queues_.makeSemaphore(0);
  std::atomic<int> taken = 0;
  onThreads(4, [&](int thread) {
    for (int i = 0; i < 500; ++i) {
      if (thread % 2 == 0) {
        semaphore->signal();
      } else if (semaphore->wait(20s)) {
        ++taken;
      }
    }
  });
  EXPECT_EQ(taken, 1000);
}

}  // namespace
}  // namespace zelkord
