#include <gtest/gtest.h>

#include <atomic>
#include <thread>
#include <vector>

#include "platform/linux/loop/Loop.h"
#include "platform/linux/queues/LinuxWorkQueues.h"

// What a loop makes of posted tasks. Races are for ThreadSanitizer to find.

namespace zelkord {
namespace {

class LoopInboxTest : public testing::Test {
 protected:
  // Where a task runs that a worker posts; none when it has not run by the end of the post.
  std::thread::id postFromWorker(std::thread::id& worker) {
    std::thread::id where;
    const auto queue = queues_.makeSerialQueue("poster");
    const auto done = queues_.makeSemaphore(0);
    queue->async([&] {
      const auto ran = std::make_shared<std::atomic<std::thread::id>>();
      worker = std::this_thread::get_id();
      loop_.post([ran] { *ran = std::this_thread::get_id(); });
      where = *ran;
      done->signal();
    });
    EXPECT_TRUE(done->wait(20s));
    return where;
  }

  LinuxClock clock_;
  LinuxWorkQueues queues_{clock_, 3};
  Loop loop_{"test"};
};

TEST_F(LoopInboxTest, ASleepingLoopRunsWhatAWorkerPostsOnItsThread) {
  std::thread::id where, worker;
  loop_.sync([&] { where = std::this_thread::get_id(); });
  EXPECT_NE(where, std::this_thread::get_id());  // no worker: the loop's own thread is woken
  const auto deadline = clock_.realNow() + 20s;
  while (postFromWorker(worker) != worker) {  // the loop was still awake
    ASSERT_LT(clock_.realNow(), deadline);
  }
}

TEST_F(LoopInboxTest, ALoopsThreadIsNotLentAnotherLoop) {
  Loop other("other");
  std::thread::id where, itself;
  other.sync([] {});
  for (int round = 0; round < 50; ++round) {
    loop_.sync([&] {
      itself = std::this_thread::get_id();
      other.post([&] { where = std::this_thread::get_id(); });
    });
    other.sync([] {});
    EXPECT_NE(where, itself);
  }
}

TEST_F(LoopInboxTest, ATimeThatIsSetMeanwhileEndsTheSleep) {
  const auto fired = queues_.makeSemaphore(0);
  Subscription timer;
  for (int round = 0; round < 20; ++round) {
    queues_.global(QualityOfService::Default).async([&] {
      loop_.post([&] { timer = loop_.after(1ms, [&] { fired->signal(); }); });
    });
    ASSERT_TRUE(fired->wait(20s));
  }
  loop_.sync([&] { timer.reset(); });
}

TEST_F(LoopInboxTest, NothingIsLostOrReorderedHoweverManyPost) {
  constexpr int kPosts = 2000;
  constexpr std::size_t kPosters = 4;
  std::vector<int> last(kPosters);  // the loop's
  int outOfOrder = 0;
  const auto poster = [&](std::size_t self) {
    for (int i = 1; i <= kPosts; ++i) {
      loop_.post([&, self, i] { outOfOrder += std::exchange(last[self], i) != i - 1; });
      if (i % 64 == 0) std::this_thread::yield();
    }
  };
  std::vector<std::thread> threads;
  const auto group = queues_.makeGroup();
  for (std::size_t self = 0; self < kPosters; ++self) {
    if (self % 2 == 0) {
      threads.emplace_back(poster, self);
    } else {
      group->enter();
      queues_.global(QualityOfService::Default).async([&, self] {
        poster(self);
        group->leave();
      });
    }
  }
  for (auto& thread : threads) thread.join();
  ASSERT_TRUE(group->wait(60s));
  loop_.sync([&] {
    EXPECT_EQ(last, std::vector<int>(kPosters, kPosts));
    EXPECT_EQ(outOfOrder, 0);
  });
}

}  // namespace
}  // namespace zelkord
