#include <gtest/gtest.h>
#include <sys/eventfd.h>
#include <sys/resource.h>

#include <atomic>
#include <string>
#include <thread>

#include "platform/linux/loop/Loop.h"
#include "platform/linux/loop/LoopTimer.h"

namespace zelkord {
namespace {

void keepBusy(Duration time) {
  const auto end = steadyNow() + time;
  while (steadyNow() < end) {
  }
}

std::string nameOfThread() {
  char name[16] = {};
  ::pthread_getname_np(::pthread_self(), name, sizeof name);
  return name;
}

// Waits until what belongs to the loop has become true.
template <typename Condition>
bool becomesTrue(Loop& loop, Condition condition) {
  bool is = false;
  for (const auto end = steadyNow() + 20s; !is && steadyNow() < end;) {
    loop.sync([&] { is = condition(); });
  }
  return is;
}

TEST(LoopTest, WorkForSpareTimeLetsWhatComesMeanwhileGoFirst) {
  Loop loop("test");
  std::string order;
  loop.post([&] {
    for (int i = 0; i < 3; ++i) {
      loop.inSpareTime([&] {
        order += "long ";
        keepBusy(2ms);
        loop.post([&] { order += "posted "; });
      });
    }
    loop.soon([&] { order += "soon "; });
  });
  const std::string wanted = "soon long posted long posted long posted ";
  EXPECT_TRUE(becomesTrue(loop, [&] { return order.size() >= wanted.size(); }));
  EXPECT_EQ(order, wanted);
}

TEST(LoopTest, ShortWorkForSpareTimeIsDoneInOrderAndNotOneByOne) {
  Loop loop("test");
  std::string order;
  loop.sync([&] {
    for (const char* letter : {"a", "b", "c"}) {
      loop.inSpareTime([&, letter] {
        order += letter;
        loop.soon([&] { order += "."; });
      });
    }
  });
  EXPECT_TRUE(becomesTrue(loop, [&] { return order.size() >= 6; }));
  EXPECT_EQ(order, "abc...");
}

TEST(LoopTest, HasNoThreadBeforeTheFirstTaskAndNoneThatWakesUpWithoutReason) {
  Loop loop("test-loop");
  rusage before{};
  rusage after{};
  std::string name;
  LoopTimer cancelled(loop, [] {});
  loop.sync([&] {
    name = nameOfThread();
    cancelled.set(steadyNow() + 50ms);
  });
  std::this_thread::sleep_for(5ms);
  loop.sync([&] {
    cancelled.set(LoopTimer::kNever);
    ::getrusage(RUSAGE_THREAD, &before);
  });
  EXPECT_EQ(name, "test-loop");
  std::this_thread::sleep_for(100ms);
  loop.sync([&] { ::getrusage(RUSAGE_THREAD, &after); });
  EXPECT_LE(after.ru_nvcsw - before.ru_nvcsw, 2) << "it goes to sleep, and is woken to be asked";
}

TEST(LoopTest, TimersGoOffInTheOrderOfTheirTimesAndOnlyWhileTheyAreSet) {
  Loop loop("test");
  std::string order;
  const auto note = [&](const char* letter) { return [&order, letter] { order += letter; }; };
  LoopTimer moved(loop, note("m"));
  LoopTimer again(loop, [&] {
    order += "a";
    if (order.size() < 6) again.set(steadyNow() + 5ms);
  });
  Subscription timers[4];
  loop.sync([&] {
    moved.set(steadyNow() + 1ms);
    timers[0] = loop.after(20ms, note("2"));
    timers[1] = loop.after(10ms, note("1"));
    timers[2] = loop.after(1ms, note("x"));
    timers[3] = loop.after(30ms, [&] {
      order += "3";
      timers[3].reset();  // its own
      again.set(steadyNow());
    });
    timers[2].reset();
    moved.set(steadyNow() + 15ms);
  });
  EXPECT_TRUE(becomesTrue(loop, [&] { return order.size() >= 6; }));
  loop.stop();
  EXPECT_EQ(order, "1m23aa");
}

TEST(LoopTest, ADescriptorsNumberMayBecomeAnotherOnes) {
  Loop loop("test");
  std::string order;
  Descriptor first(::eventfd(1, EFD_CLOEXEC));
  const int number = first.get();
  const Descriptor kept(::dup(number));  // the first one stays open, and epoll knows it
  Subscription watches[2];
  loop.sync([&] {
    watches[0] = loop.watch(number, EPOLLIN | EPOLLET, [&](std::uint32_t) { order += "first "; });
    first.reset();
    first = Descriptor(::eventfd(0, EFD_CLOEXEC));
    ASSERT_EQ(first.get(), number);
    watches[1] = loop.watch(number, EPOLLIN | EPOLLET, [&](std::uint32_t) { order += "second "; });
    watches[0].reset();
    loop.soon([&] { ::eventfd_write(number, 1); });
  });
  EXPECT_TRUE(becomesTrue(loop, [&] { return !order.empty(); }));
  loop.stop();
  EXPECT_EQ(order, "second ");
}

TEST(LoopTest, AtItsEndRunsWhatWasPostedThenWhatWaitsForTheEnd) {
  Loop loop("test");
  std::string order;
  Subscription endings[3];
  loop.sync([&] {
    for (const char* name : {"first ", "gone ", "last "}) {
      endings[name[0] == 'f'   ? 0
              : name[0] == 'g' ? 1
                               : 2] = loop.atEnd([&order, name] { order += name; });
    }
    endings[1].reset();
    loop.post([&] {
      order += "posted ";
      keepBusy(5ms);
    });
  });
  loop.stop();
  EXPECT_FALSE(loop.post([&] { order += "late "; }));
  loop.sync([&] { order += "inline"; });
  EXPECT_EQ(order, "posted last first inline");
}

TEST(LoopTest, ASyncEndsHoweverTheLoopDoes) {
  for (int round = 0; round < 100; ++round) {
    Loop loop("test");
    loop.post([] {});
    std::atomic<int> ran = 0;
    std::thread other([&] {
      for (int i = 0; i < 10; ++i) loop.sync([&] { ++ran; });
    });
    loop.stop();
    other.join();
    EXPECT_EQ(ran, 10);
  }
}

}  // namespace
}  // namespace zelkord
