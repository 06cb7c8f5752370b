#include <gtest/gtest.h>

#include <atomic>
#include <memory>
#include <thread>
#include <vector>

#include "platform/linux/queues/LinuxWorkQueues.h"
#include "platform/testing/ManualTimeline.h"

// What every user of queues relies on, run on the real queues and on the manual timeline.

namespace zelkord {
namespace {

// The factory under test, and how its tests wait.
class QueueHost {
 public:
  virtual ~QueueHost() = default;
  virtual WorkQueues& queues() = 0;
  // Lets work go on until `done`. False when that takes unreasonably long.
  virtual bool eventually(FunctionRef<bool()> done) = 0;
};

class ManualQueueHost final : public QueueHost {
 public:
  WorkQueues& queues() override { return timeline_; }
  bool eventually(FunctionRef<bool()> done) override { return timeline_.runUntil(done); }

 private:
  ManualTimeline timeline_;
};

class LinuxQueueHost final : public QueueHost {
 public:
  WorkQueues& queues() override { return queues_; }
  bool eventually(FunctionRef<bool()> done) override {
    const auto deadline = clock_.realNow() + 20s;
    while (!done()) {
      if (clock_.realNow() > deadline) return false;
      std::this_thread::yield();
    }
    return true;
  }

 private:
  LinuxClock clock_;
  LinuxWorkQueues queues_{clock_};
};

enum class HostKind { Manual, Linux };

class WorkQueuesContract : public testing::TestWithParam<HostKind> {
 protected:
  WorkQueuesContract() {
    if (GetParam() == HostKind::Manual) {
      host_ = std::make_unique<ManualQueueHost>();
    } else {
      host_ = std::make_unique<LinuxQueueHost>();
    }
  }
  WorkQueues& queues() { return host_->queues(); }
  bool eventually(FunctionRef<bool()> done) { return host_->eventually(done); }
  // Keeps a serial queue busy until the semaphore is signalled, so that what follows piles up
  // behind it.
  void block(SerialQueue& queue, Semaphore& gate) {
    queue.async([&gate] { EXPECT_TRUE(gate.wait(20s)); });
  }

  std::unique_ptr<QueueHost> host_;
};

INSTANTIATE_TEST_SUITE_P(Hosts, WorkQueuesContract,
                         testing::Values(HostKind::Manual, HostKind::Linux), [](const auto& test) {
                           return test.param == HostKind::Manual ? "Manual" : "Linux";
                         });

TEST_P(WorkQueuesContract, SerialTasksRunInTheOrderOfAsyncAndSync) {
  const auto queue = queues().makeSerialQueue("serial");
  std::vector<int> order;
  for (int i = 0; i < 100; i += 2) {
    queue->async([&order, i] { order.push_back(i); });
    queue->sync([&] { order.push_back(i + 1); });
  }
  std::vector<int> expected(100);
  for (int i = 0; i < 100; ++i) expected[static_cast<std::size_t>(i)] = i;
  EXPECT_EQ(order, expected);
}

TEST_P(WorkQueuesContract, SyncRunsOnTheCallersThreadAndAsyncNeverInline) {
  const auto queue = queues().makeSerialQueue("serial");
  std::thread::id where;
  queue->sync([&] { where = std::this_thread::get_id(); });
  EXPECT_EQ(where, std::this_thread::get_id());

  std::atomic<bool> began = false, ended = false;
  queue->sync([&] {
    queue->async([&] {
      EXPECT_TRUE(ended);
      began = true;
    });
    ended = true;
  });
  EXPECT_TRUE(eventually([&] { return began.load(); }));
}

TEST_P(WorkQueuesContract, BarriersSeeEverythingBeforeThemAndNothingAfter) {
  const auto queue = queues().makeConcurrentQueue("concurrent");
  std::atomic<int> reads = 0;
  std::vector<int> seen;
  for (int round = 0; round < 20; ++round) {
    for (int i = 0; i < 5; ++i) queue->async([&] { ++reads; });
    queue->barrierAsync([&] {
      queue->assertBarrier();
      seen.push_back(reads);
    });
  }
  queue->barrierSync([&] { EXPECT_EQ(seen.size(), 20u); });
  for (int round = 0; round < 20; ++round) {
    EXPECT_EQ(seen[static_cast<std::size_t>(round)], 5 * (round + 1));
  }
}

TEST_P(WorkQueuesContract, ATaskIsOnItsQueueAndOnThoseItCameThrough) {
  const auto serial = queues().makeSerialQueue("serial");
  const auto concurrent = queues().makeConcurrentQueue("concurrent");
  auto& global = queues().global(QualityOfService::Utility);
  EXPECT_FALSE(serial->isCurrent());
  bool ended = false;
  concurrent->sync([&] {
    EXPECT_TRUE(concurrent->isCurrent());
    EXPECT_FALSE(concurrent->isBarrierCurrent());
    serial->sync([&] {
      EXPECT_TRUE(serial->isCurrent());
      EXPECT_TRUE(concurrent->isCurrent());
      global.sync(
          [&] { global.sync([&] { EXPECT_TRUE(global.isCurrent() && serial->isCurrent()); }); });
      EXPECT_FALSE(global.isCurrent());
      serial->async([&] {
        EXPECT_TRUE(serial->isCurrent());
        EXPECT_FALSE(concurrent->isCurrent());
        ended = true;
      });
    });
  });
  serial->sync([&] { EXPECT_TRUE(ended); });
}

TEST_P(WorkQueuesContract, DelayedTasksRunInTheOrderOfTheirTimesUnlessCancelled) {
  const auto queue = queues().makeSerialQueue("serial");
  std::vector<int> order;
  std::atomic<int> count = 0;
  std::vector<Subscription> delayed;
  const auto add = [&](int number, Duration delay, TimeBase base = TimeBase::Scaled) {
    delayed.push_back(queue->after(
        delay,
        [&, number] {
          order.push_back(number);
          ++count;
        },
        base));
  };
  add(3, 60ms, TimeBase::Real);
  add(2, 30ms);
  add(1, 0s);
  add(0, 30ms);
  delayed.pop_back();
  EXPECT_TRUE(eventually([&] { return count == 3; }));
  queue->sync([&] { EXPECT_EQ(order, (std::vector{1, 2, 3})); });
}

TEST_P(WorkQueuesContract, ACancelledTaskThatIsAlreadyDueDoesNotRunAndIsReleased) {
  const auto queue = queues().makeSerialQueue("serial");
  const auto other = queues().makeSerialQueue("other");
  const auto gate = queues().makeSemaphore(0);
  block(*queue, *gate);
  const auto captured = std::make_shared<int>();
  auto delayed = queue->after(0s, [captured] { ADD_FAILURE() << "ran though cancelled"; });
  std::atomic<bool> due = false;
  const auto later = other->after(20ms, [&] {
    delayed.reset();
    due = true;
    gate->signal();
  });
  EXPECT_TRUE(eventually([&] { return due.load(); }));
  queue->sync([] {});
  EXPECT_TRUE(eventually([&] { return captured.use_count() == 1; }));
}

TEST_P(WorkQueuesContract, ADestroyedQueueDropsWhatHasNotBegun) {
  auto queue = queues().makeSerialQueue("serial");
  const auto gate = queues().makeSemaphore(0);
  const auto captured = std::make_shared<int>();
  const auto other = queues().makeSerialQueue("other");
  std::atomic<bool> began = false, due = false, ended = false;
  queue->async([&] {
    began = true;
    gate->wait(20s);
    ended = true;
  });
  queue->async([captured] { ADD_FAILURE() << "ran on a destroyed queue"; });
  const auto waiting = queue->after(1ms, [captured] { ADD_FAILURE() << "was due before"; });
  const auto delayed = queue->after(1h, [captured] { ADD_FAILURE() << "came later"; });
  const auto passed = other->after(5ms, [&] { due = true; });
  if (GetParam() == HostKind::Linux) {
    EXPECT_TRUE(eventually([&] { return began && due; }));
  }
  const auto release = other->after(200ms, [&] { gate->signal(); });
  queue.reset();
  EXPECT_EQ(began, ended);  // what had begun was waited for
  EXPECT_TRUE(eventually([&] { return captured.use_count() == 1; }));
}

TEST_P(WorkQueuesContract, AQueueMayBeDestroyedByItsOwnTask) {
  const auto after = queues().makeSerialQueue("after");
  for (const bool inSync : {false, true}) {
    SCOPED_TRACE(inSync);
    auto queue = queues().makeSerialQueue("serial");
    std::atomic<bool> done = false;
    const auto destroy = [&] {
      queue->async([] { ADD_FAILURE() << "ran on a destroyed queue"; });
      queue.reset();
      done = true;
    };
    inSync ? queue->sync(destroy) : queue->async(destroy);
    EXPECT_TRUE(eventually([&] { return done.load(); }));
  }
}

TEST_P(WorkQueuesContract, CapturesAreReleasedOnTheQueueBeforeTheNextTask) {
  const auto queue = queues().makeSerialQueue("serial");
  struct Captured {
    SerialQueue& queue;
    bool& released;
    ~Captured() {
      EXPECT_TRUE(queue.isCurrent());
      released = true;
    }
  };
  bool released = false;
  std::shared_ptr<Captured> captured(new Captured{*queue, released});
  queue->async([kept = std::move(captured)] { EXPECT_FALSE(kept->released); });
  queue->async([&] { EXPECT_TRUE(released); });
  queue->sync([&] { EXPECT_TRUE(released); });
}

TEST_P(WorkQueuesContract, ATimerFiresOnceForItsLastArming) {
  const auto queue = queues().makeSerialQueue("serial");
  std::atomic<int> fired = 0;
  const auto timer = queues().makeTimer(*queue, [&] { ++fired; });
  // While the queue is busy, however long that takes, a timer can be due but not have fired.
  const auto gate = queues().makeSemaphore(0);
  block(*queue, *gate);
  timer->arm(1h, 0s);
  timer->arm(5ms, 1ms);   // earlier than before
  timer->arm(20ms, 5ms);  // later than before
  gate->signal();
  EXPECT_TRUE(eventually([&] { return fired == 1; }));

  std::atomic<bool> passed = false;
  block(*queue, *gate);
  timer->arm(5ms, 0s);
  timer->cancel();
  auto doomed = queues().makeTimer(*queue, [] { ADD_FAILURE() << "fired though destroyed"; });
  doomed->arm(5ms, 0s);
  doomed.reset();
  const auto later = queue->after(30ms, [&] { passed = true; });
  gate->signal();
  EXPECT_TRUE(eventually([&] { return passed.load(); }));
  EXPECT_EQ(fired, 1);
}

TEST_P(WorkQueuesContract, ATimerMayBeArmedByItsOwnTask) {
  const auto queue = queues().makeSerialQueue("serial");
  std::unique_ptr<Timer> timer;
  int fired = 0;
  std::atomic<bool> done = false;
  timer = queues().makeTimer(*queue, [&] {
    if (++fired < 5) {
      timer->arm(1ms, 0s);
    } else {
      done = true;
    }
  });
  timer->arm(1ms, 0s);
  EXPECT_TRUE(eventually([&] { return done.load(); }));
  queue->sync([&] { EXPECT_EQ(fired, 5); });
}

TEST_P(WorkQueuesContract, PermitsAddUpAndAreTakenOnce) {
  const auto semaphore = queues().makeSemaphore(1);
  semaphore->signal();
  semaphore->signal(2);
  for (const bool expected : {true, true, true, true, false}) {
    EXPECT_EQ(semaphore->wait(expected ? 1s : 1ms), expected);
  }
  EXPECT_FALSE(semaphore->wait(0s));
}

TEST_P(WorkQueuesContract, AWaitEndsWithTheSignalOfAnotherQueue) {
  const auto queue = queues().makeSerialQueue("serial");
  const auto semaphore = queues().makeSemaphore(0);
  queue->async([&] { semaphore->signal(); });
  EXPECT_TRUE(semaphore->wait(20s));

  const auto group = queues().makeGroup();
  EXPECT_TRUE(group->wait(0s));
  for (int i = 0; i < 3; ++i) {
    group->enter();
    queues().global(QualityOfService::Default).async([&] { group->leave(); });
  }
  EXPECT_TRUE(group->wait(20s));
  group->enter();
  EXPECT_FALSE(group->wait(1ms));
}

TEST_P(WorkQueuesContract, SixtyFourWaitersDoNotKeepOthersFromWork) {
  constexpr int kWaiters = 64;
  const auto gate = queues().makeSemaphore(0);
  std::vector<std::unique_ptr<SerialQueue>> waiters;
  std::atomic<int> waiting = 0, answered = 0;
  for (int i = 0; i < kWaiters; ++i) {
    waiters.push_back(queues().makeSerialQueue("waiter"));
    waiters.back()->async([&] {
      if (++waiting == kWaiters) {
        queues().global(QualityOfService::Background).async([&] { gate->signal(kWaiters); });
      }
      if (gate->wait(20s)) ++answered;
    });
  }
  EXPECT_TRUE(eventually([&] { return answered == kWaiters; }));
}

TEST_P(WorkQueuesContract, SyncOnTheOwnQueueStopsTheProcess) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  const auto serial = queues().makeSerialQueue("serial");
  const auto concurrent = queues().makeConcurrentQueue("concurrent");
  EXPECT_DEATH(serial->sync([&] { concurrent->sync([&] { serial->sync([] {}); }); }),
               "caller's own queue");
  EXPECT_DEATH(concurrent->sync([&] { concurrent->barrierSync([] {}); }), "caller's own queue");
  EXPECT_DEATH(serial->assertCurrent(), "not on the queue");
}

}  // namespace
}  // namespace zelkord
