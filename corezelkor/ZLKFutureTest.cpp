#include <gtest/gtest.h>

#include <atomic>
#include <string>
#include <thread>
#include <vector>

#include "corezelkor/ZLKFuture.h"
#include "corezelkor/ZLKPromise.h"

namespace zelkor {
namespace {

TEST(ZLKFutureTest, KeepsTheFirstValue) {
  const ZLKPromise<int> promise;
  const auto future = promise.future();
  EXPECT_EQ(future.find(), nullptr);
  EXPECT_EQ(future.getWithin(1ns), nullptr);
  EXPECT_TRUE(promise.fulfill(1));
  EXPECT_FALSE(promise.fulfill(2));
  EXPECT_EQ(future.get(), 1);
}

TEST(ZLKFutureTest, ReactsOnceInOrderWheneverTheValueComes) {
  std::string seen;
  const ZLKPromise<std::string> promise;
  promise.future().then([&](const std::string& value) { seen += "1" + value; });
  promise.future().then([&](const std::string& value) {
    seen += "2" + value;
    // Registered from a reaction: the value is there, so it runs at once.
    promise.future().then([&](const std::string&) { seen += "3"; });
  });
  EXPECT_EQ(seen, "");
  promise.fulfill("a");
  promise.fulfill("b");
  EXPECT_EQ(seen, "1a2a3");
  ZLKFuture<std::string>("x").then([&](const std::string& value) { seen += value; });
  EXPECT_EQ(seen, "1a2a3x");
}

TEST(ZLKFutureTest, WakesEveryThreadThatWaits) {
  const ZLKPromise<int> promise;
  std::vector<std::thread> threads;
  std::atomic<int> sum = 0;
  for (int i = 0; i < 4; ++i) {
    threads.emplace_back([&, future = promise.future()] { sum += future.get(); });
  }
  promise.fulfill(7);
  for (auto& thread : threads) thread.join();
  EXPECT_EQ(sum, 28);
}

}  // namespace
}  // namespace zelkor
