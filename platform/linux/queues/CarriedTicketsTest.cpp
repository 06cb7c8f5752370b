// Loops with a crew, and the queues that their work goes to.

#include <gtest/gtest.h>
#include <sys/eventfd.h>

#include <algorithm>
#include <atomic>
#include <future>
#include <memory>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "platform/linux/loop/Loop.h"
#include "platform/linux/queues/LinuxWorkQueues.h"

namespace zelkord {
namespace {

using ThreadId = std::thread::id;

// Something that happens once, on any thread.
class Moment {
 public:
  void comes() const { state_->promise.set_value(); }
  bool hasCome(std::chrono::seconds limit = 20s) const {
    return state_->future.wait_for(limit) == std::future_status::ready;
  }

 private:
  struct State {
    std::promise<void> promise;
    const std::shared_future<void> future = promise.get_future().share();
  };
  const std::shared_ptr<State> state_ = std::make_shared<State>();
};

// A loop with one descriptor, whose events go to a serial queue.
class CarriedTicketsTest : public testing::Test {
 protected:
  void SetUp() override {
    loop_.sync([this] {
      watch_ = loop_.watch(event_.get(), EPOLLIN, [this](std::uint32_t) { _read(); });
    });
    // Until somebody follows.
    const auto limit = steadyNow() + 20s;
    bool isCarried = false;
    while (!isCarried && steadyNow() < limit) {
      const auto [reader, runner] = readerAndRunner();
      isCarried = reader == runner;
    }
    ASSERT_TRUE(isCarried);
  }
  void TearDown() override {
    for (const auto& moment : toCome_) moment.comes();
    loop_.sync([this] { watch_.reset(); });
    loop_.stop();
  }

  // Has the loop read an event and submit the task.
  void submit(Task task) {
    {
      const MutexLock lock(mutex_);
      next_.push_back(std::move(task));
    }
    ::eventfd_write(event_.get(), 1);
  }
  // Who reads the loop's next event, and who runs the task that comes from it.
  std::pair<ThreadId, ThreadId> readerAndRunner() {
    const Moment ran;
    const auto runner = std::make_shared<ThreadId>();
    submit([ran, runner] {
      *runner = std::this_thread::get_id();
      ran.comes();
    });
    EXPECT_TRUE(ran.hasCome());
    const MutexLock lock(mutex_);
    return {reader_, *runner};
  }
  // Whether the loop reads events, though what they bring may wait.
  bool isServed() {
    const Moment read;
    {
      const MutexLock lock(mutex_);
      onRead_ = [read] { read.comes(); };
    }
    submit([] {});
    return read.hasCome();
  }
  // Submits a task that waits for the moment returned.
  Moment submitOneThatWaits(SerialQueue& queue) {
    const Moment began;
    const Moment end;
    toCome_.push_back(end);
    loop_.post([&queue, began, end] {
      queue.async([began, end] {
        began.comes();
        EXPECT_TRUE(end.hasCome());
      });
    });
    EXPECT_TRUE(began.hasCome());
    return end;
  }
  void let(const Moment& moment) {
    moment.comes();
    toCome_.clear();
  }

  const LinuxClock clock_;
  LinuxWorkQueues queues_{clock_, 2};
  const std::unique_ptr<SerialQueue> queue_ = queues_.makeSerialQueue("test");
  const std::unique_ptr<SerialQueue> other_ = queues_.makeSerialQueue("other");
  Loop loop_{"test", &queues_.crew()};
  std::vector<Moment> toCome_;

 private:
  void _read() {
    eventfd_t count = 0;
    ::eventfd_read(event_.get(), &count);
    std::vector<Task> tasks;
    std::function<void()> onRead;
    {
      const MutexLock lock(mutex_);
      reader_ = std::this_thread::get_id();
      tasks.swap(next_);
      onRead.swap(onRead_);
    }
    if (onRead) onRead();
    for (auto& task : tasks) queue_->async(std::move(task));
  }

  const Descriptor event_{::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)};
  Subscription watch_;
  Mutex mutex_;
  ThreadId reader_ ZK_GUARDED_BY(mutex_);
  std::function<void()> onRead_ ZK_GUARDED_BY(mutex_);
  std::vector<Task> next_ ZK_GUARDED_BY(mutex_);
};

// Not each time: whoever is still on the way back does not follow yet.
TEST_F(CarriedTicketsTest, WhoReadItCarriesItToItsEnd) {
  int carried = 0;
  for (int i = 0; i < 50; ++i) {
    const auto [reader, runner] = readerAndRunner();
    if (reader == runner) ++carried;
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
  }
  EXPECT_GE(carried, 10);
}

TEST_F(CarriedTicketsTest, WhatFollowsRunsThereTooAfterIt) {
  int followed = 0;
  for (int i = 0; i < 50; ++i) {
    const Moment ran;
    bool isOver = false;
    submit([&, ran] {
      other_->async([&, ran, runner = std::this_thread::get_id()] {
        if (runner == std::this_thread::get_id() && isOver) ++followed;
        ran.comes();
      });
      std::this_thread::sleep_for(std::chrono::microseconds(100));
      isOver = true;
    });
    EXPECT_TRUE(ran.hasCome());
    queue_->sync([] {});
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
  }
  EXPECT_GE(followed, 10);
}

TEST_F(CarriedTicketsTest, WhatIsMoreUrgentDoesNotWaitForWhoBringsIt) {
  const auto urgent = queues_.makeSerialQueue("urgent", QualityOfService::High);
  for (int i = 0; i < 10; ++i) {
    const Moment ran;
    submit([&urgent, ran] {
      urgent->async([ran] { ran.comes(); });
      EXPECT_TRUE(ran.hasCome());
    });
    EXPECT_TRUE(ran.hasCome());
    queue_->sync([] {});
  }
}

// Also more often than anybody can follow.
TEST_F(CarriedTicketsTest, OneThatWaitsHoldsUpNeitherTheLoopNorWhatItWaitsFor) {
  for (int i = 0; i < 5; ++i) {
    const std::shared_ptr<Semaphore> semaphore = queues_.makeSemaphore(0);
    const Moment waited;
    const Moment end;
    toCome_.push_back(end);
    submit([this, semaphore, waited, end] {
      other_->async([semaphore] { semaphore->signal(); });
      EXPECT_TRUE(semaphore->wait(20s));
      waited.comes();
      EXPECT_TRUE(end.hasCome());
    });
    EXPECT_TRUE(waited.hasCome());
    EXPECT_TRUE(isServed());
    let(end);
  }
}

TEST_F(CarriedTicketsTest, ALoopEndsWhileItsLeaderIsAway) {
  const auto end = submitOneThatWaits(*queue_);
  loop_.stop();
  EXPECT_FALSE(loop_.post([] {}));
  let(end);
  queue_->sync([] {});
}

// The leader has taken the order to stop, and work that waits, in one turn.
TEST_F(CarriedTicketsTest, ALoopThatIsToEndIsNotLeft) {
  const Moment end;
  toCome_.push_back(end);
  const Moment mayStop;
  const Moment stopped;
  loop_.post([this, end, mayStop] {
    queue_->async([end] { EXPECT_TRUE(end.hasCome()); });
    mayStop.comes();
    std::this_thread::sleep_for(std::chrono::milliseconds(50));
  });
  std::thread stopping([this, mayStop, stopped] {
    EXPECT_TRUE(mayStop.hasCome());
    loop_.stop();
    stopped.comes();
  });
  EXPECT_TRUE(stopped.hasCome());
  let(end);
  stopping.join();
}

TEST_F(CarriedTicketsTest, WhoIsCountedOnStaysThoughAnotherLoopEnds) {
  Loop ending("ending", &queues_.crew());
  ending.sync([] {});
  const auto first = submitOneThatWaits(*queue_);
  const auto second = submitOneThatWaits(*other_);
  ending.stop();
  EXPECT_TRUE(isServed());
  first.comes();
  second.comes();
  toCome_.clear();
  EXPECT_TRUE(isServed());
}

// Races for a ThreadSanitizer to see; and nothing is lost, doubled or out of order.
TEST_F(CarriedTicketsTest, ManyWhoPostAndALeaderWhoComesAndGoes) {
  constexpr std::size_t kThreads = 4;
  constexpr std::size_t kTasks = 500;
  std::vector<std::size_t> order[kThreads];
  std::atomic<std::size_t> followUps = 0;
  const auto submitAll = [&](std::size_t thread) {
    for (std::size_t i = 0; i < kTasks; ++i) {
      loop_.post([&, thread, i] {
        queue_->async([&, thread, i] {
          order[thread].push_back(i);
          if (i % 2 == 0) other_->async([&] { ++followUps; });
          if (i % 50 == 0) std::this_thread::sleep_for(std::chrono::microseconds(300));
        });
      });
      if (i % 10 == 0) submit([] {});
    }
  };
  std::vector<std::thread> threads;
  for (std::size_t thread = 0; thread < kThreads; ++thread) {
    threads.emplace_back(submitAll, thread);
  }
  for (auto& thread : threads) thread.join();
  loop_.sync([] {});
  queue_->sync([] {});
  other_->sync([] {});
  for (const auto& tasks : order) {
    EXPECT_EQ(tasks.size(), kTasks);
    EXPECT_TRUE(std::is_sorted(tasks.begin(), tasks.end()));
  }
  EXPECT_EQ(followUps, kThreads * kTasks / 2);
}

}  // namespace
}  // namespace zelkord
