#include <gtest/gtest.h>

#include <boost/json/serialize.hpp>

#include "sandbox/TestData.h"
#include "sandbox/service/RequestLog.h"

namespace sandbox {

namespace {

LoggedRequest loggedRequest(const std::string& path) {
  return {.time = 1.5,
          .method = "GET",
          .path = path,
          .items = {{"q", "\xFFü"}, {"n", std::nullopt}, {"q", ""}},
          .target = path + "?q",
          .headers = {{"Host", "h"}, {"A", "\"b\""}},
          .bodySize = 3,
          .status = 200,
          .connection = 7,
          .tlsReused = true,
          .microseconds = 9};
}

}  // namespace

TEST(RequestLogTest, ReadsBackInOrderWhatWasRecordedBefore) {
  const TemporaryFolder folder;
  auto log = *RequestLog::open(folder.path() / "requests.db");
  log->record(loggedRequest("/search"));
  log->record(loggedRequest("/bag"));
  const auto all = log->read({});
  ASSERT_EQ(all.size(), 2U);
  EXPECT_EQ(boost::json::serialize(all.at(0).at("items")), R"([["q","�ü"],["n",null],["q",""]])");
  EXPECT_EQ(boost::json::serialize(all.at(0).at("headers")), R"([["Host","h"],["A","\"b\""]])");
  EXPECT_EQ(all.at(0).at("tls_session_reused"), true);
  EXPECT_EQ(log->read({.path = "/bag"}).size(), 1U);
  EXPECT_EQ(log->read({.since = 1}).at(0).at("path"), "/bag");
  EXPECT_EQ(log->read({.limit = 1}).size(), 1U);
}

TEST(RequestLogTest, NumbersGoOnAfterClearingAndReopening) {
  const TemporaryFolder folder;
  const auto path = folder.path() / "requests.db";
  {
    auto log = *RequestLog::open(path);
    log->record(loggedRequest("/a"));
    log->clear();
    EXPECT_TRUE(log->read({}).empty());
    log->record(loggedRequest("/b"));
  }
  auto log = *RequestLog::open(path);
  log->record(loggedRequest("/c"));
  const auto all = log->read({});
  ASSERT_EQ(all.size(), 2U);
  EXPECT_EQ(all.at(0).at("id"), 2);
  EXPECT_EQ(all.at(1).at("id"), 3);
}

TEST(RequestLogTest, LosesNothingOfManyThreads) {
  const TemporaryFolder folder;
  auto log = *RequestLog::open(folder.path() / "requests.db");
  std::vector<std::thread> threads;
  for (int number = 0; number < 4; ++number) {
    threads.emplace_back([&] {
      for (int time = 0; time < 200; ++time) {
        log->record(loggedRequest("/search"));
        if (time % 50 == 0) log->flush();
      }
    });
  }
  for (auto& thread : threads) thread.join();
  EXPECT_EQ(log->read({}).size(), 800U);
}

}  // namespace sandbox
