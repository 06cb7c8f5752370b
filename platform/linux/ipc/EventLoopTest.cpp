#include <gtest/gtest.h>

#include <string>
#include <thread>

#include "platform/linux/ipc/EventLoop.h"

namespace zelkord::ipc {
namespace {

void keepBusy(Duration time) {
  const auto end = std::chrono::steady_clock::now() + time;
  while (std::chrono::steady_clock::now() < end) {
  }
}

TEST(EventLoopTest, WorkForSpareTimeLetsWhatComesMeanwhileGoFirst) {
  EventLoop loop;
  std::string order;
  loop.inbox()->post([&] {
    for (int i = 0; i < 3; ++i) {
      loop.inSpareTime([&] {
        order += "long ";
        keepBusy(2ms);
        loop.inbox()->post([&] { order += "posted "; });
      });
    }
    loop.soon([&] { order += "soon "; });
  });
  std::string seen;
  while (loop.sync([&] { seen = order; }) && seen.find("posted") == std::string::npos) {
  }
  std::this_thread::sleep_for(50ms);
  loop.sync([&] { seen = order; });
  EXPECT_EQ(seen, "soon long posted long posted long posted ");
}

TEST(EventLoopTest, ShortWorkForSpareTimeIsDoneInOrderAndNotOneByOne) {
  EventLoop loop;
  std::string order;
  loop.sync([&] {
    for (const char* letter : {"a", "b", "c"}) {
      loop.inSpareTime([&, letter] {
        order += letter;
        loop.soon([&] { order += "."; });
      });
    }
  });
  std::string seen;
  while (loop.sync([&] { seen = order; }) && seen.size() < 6) {
  }
  EXPECT_EQ(seen, "abc...");
}

}  // namespace
}  // namespace zelkord::ipc
