#include <gtest/gtest.h>

#include <atomic>
#include <functional>
#include <thread>
#include <vector>

#include "platform/linux/ipc/EventLoop.h"
#include "platform/linux/queues/LinuxWorkQueues.h"
#include "platform/linux/queues/LoopInbox.h"
#include "platform/linux/url/IOLoop.h"

// What both loops make of posted tasks. Races are for ThreadSanitizer to find.

namespace zelkord {
namespace {

struct NamedLoop {
  const char* name;
  std::function<void(Task)> post;
  std::function<void(FunctionRef<void()>)> sync;
};

class LoopInboxTest : public testing::Test {
 protected:
  void forEachLoop(const std::function<void(const NamedLoop&)>& body) {
    ipc::EventLoop eventLoop;
    IOLoop ioLoop;
    const NamedLoop loops[] = {
        {"event loop", [&](Task task) { eventLoop.inbox()->post(std::move(task)); },
         [&](auto task) { eventLoop.sync(task); }},
        {"I/O loop", [&](Task task) { ioLoop.post(std::move(task)); },
         [&](auto task) { ioLoop.sync(task); }},
    };
    for (const auto& loop : loops) {
      SCOPED_TRACE(loop.name);
      body(loop);
    }
  }
  // Where a task runs that a worker posts; none when it has not run by the end of the post.
  std::thread::id postFromWorker(const NamedLoop& loop, std::thread::id& worker) {
    std::thread::id where;
    const auto queue = queues_.makeSerialQueue("poster");
    const auto done = queues_.makeSemaphore(0);
    queue->async([&] {
      const auto ran = std::make_shared<std::atomic<std::thread::id>>();
      worker = std::this_thread::get_id();
      loop.post([ran] { *ran = std::this_thread::get_id(); });
      where = *ran;
      done->signal();
    });
    EXPECT_TRUE(done->wait(20s));
    return where;
  }

  LinuxClock clock_;
  LinuxWorkQueues queues_{clock_, 3};
};

TEST_F(LoopInboxTest, ASleepingLoopRunsWhatAWorkerPostsOnItsThread) {
  forEachLoop([&](const NamedLoop& loop) {
    std::thread::id where, worker;
    loop.post([] {});  // starts its thread
    loop.sync([&] { where = std::this_thread::get_id(); });
    EXPECT_NE(where, std::this_thread::get_id());  // no worker: the loop's own thread is woken
    const auto deadline = clock_.realNow() + 20s;
    while (postFromWorker(loop, worker) != worker) {  // the loop was still awake
      ASSERT_LT(clock_.realNow(), deadline);
    }
  });
}

TEST_F(LoopInboxTest, ATimeThatIsSetMeanwhileEndsTheSleep) {
  ipc::EventLoop loop;
  const auto fired = queues_.makeSemaphore(0);
  Subscription timer;
  for (int round = 0; round < 20; ++round) {
    queues_.global(QualityOfService::Default).async([&, inbox = loop.inbox()] {
      inbox->post([&] { timer = loop.after(1ms, [&] { fired->signal(); }); });
    });
    ASSERT_TRUE(fired->wait(20s));
  }
  loop.sync([&] { timer.reset(); });
}

TEST_F(LoopInboxTest, NothingIsLostOrReorderedHoweverManyPost) {
  constexpr int kPosts = 2000;
  constexpr std::size_t kPosters = 4;
  forEachLoop([&](const NamedLoop& loop) {
    std::vector<int> last(kPosters);  // the loop's
    int outOfOrder = 0;
    const auto poster = [&](std::size_t self) {
      for (int i = 1; i <= kPosts; ++i) {
        loop.post([&, self, i] { outOfOrder += std::exchange(last[self], i) != i - 1; });
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
    loop.sync([&] {
      EXPECT_EQ(last, std::vector<int>(kPosters, kPosts));
      EXPECT_EQ(outOfOrder, 0);
    });
  });
}

}  // namespace
}  // namespace zelkord
