#include <gtest/gtest.h>

#include <atomic>
#include <thread>
#include <vector>

#include "platform/linux/url/URLSessionTestSupport.h"
#include "platform/testing/TestHTTPServer.h"

namespace zelkord {
namespace {

// Starts tasks and cancels every third, at whatever moment that is.
void loadAndCancel(URLSession& session, TestHTTPServer& server, URLResults& results, int count) {
  for (int i = 0; i < count; ++i) {
    const auto task = session.dataTask({.url = server.url("/")}, results.completion());
    task->resume();
    if (i % 3 == 0) task->cancel();
    (void)task->currentRequest();
    (void)task->timingData();
  }
}

TEST(CurlURLSessionStressTest, EveryTaskCompletesOnceUnderConcurrency) {
  constexpr int kThreads = 4;
  constexpr int kTasks = 60;
  TestHTTPServer server;
  server.reply("/", TestHTTPReply::make(200, "hello"));
  URLSessionTestBed bed;
  const std::vector sessions{bed.make(), bed.make()};
  URLResults results;
  std::vector<std::thread> threads;
  for (std::size_t i = 0; i < kThreads; ++i) {
    threads.emplace_back([&, i] { loadAndCancel(*sessions[i % 2], server, results, kTasks); });
  }
  for (auto& thread : threads) thread.join();
  int loaded = 0;
  for (const auto& result : results.wait(kThreads * kTasks)) {
    EXPECT_TRUE(result.status() == 200 || (result.error && result.error->code == -999));
    loaded += result.status() == 200;
  }
  EXPECT_GE(loaded, kThreads * kTasks / 2);
  EXPECT_EQ(results.count(), static_cast<std::size_t>(kThreads * kTasks));
}

TEST(CurlURLSessionStressTest, SessionsEndWhileTasksCompleteAndAreCancelled) {
  constexpr std::size_t kRounds = 20;
  TestHTTPServer server;
  server.reply("/", TestHTTPReply::make(200, "hello"));
  URLResults results, lastOnes;
  URLSessionTestBed bed;
  for (std::size_t round = 0; round < kRounds; ++round) {
    auto session = bed.make();
    std::vector<std::shared_ptr<URLTask>> tasks;
    for (int i = 0; i < 8; ++i) {
      tasks.push_back(session->dataTask({.url = server.url("/")}, results.completion()));
    }
    // A completion may hold its session, and then be what ends it.
    tasks.push_back(
        session->dataTask({.url = server.url("/")},
                          [keeps = session, collect = lastOnes.completion()](
                              const auto& task, const auto& result) { collect(task, result); }));
    for (const auto& task : tasks) task->resume();
    std::thread canceller([&] {
      for (const auto& task : tasks) task->cancel();
    });
    if (round % 2 == 0) lastOnes.wait(round + 1);
    session.reset();
    canceller.join();
  }
  lastOnes.wait(kRounds);
}

TEST(CurlURLSessionStressTest, AnswersWhileAllDownloadsFromTheHostStall) {
  constexpr std::size_t kDownloads = 48;
  const auto certificate = TestCertificate::make("127.0.0.1");
  const URLTestFile roots(certificate.certificate);
  for (const bool isSecure : {false, true}) {
    SCOPED_TRACE(isSecure ? "https" : "http");
    TestHTTPServer server(isSecure ? std::optional(certificate) : std::nullopt);
    server.reply("/image", TestHTTPReply::hanging());
    server.reply("/", TestHTTPReply::make(200, "hello"));
    URLSessionTestBed bed({.rootsFile = roots.path()});
    const auto session = bed.make({.name = "test", .pipelining = true});
    URLResults stalled;
    std::vector<std::shared_ptr<URLTask>> downloads;
    for (std::size_t i = 0; i < kDownloads; ++i) {
      downloads.push_back(
          session->downloadTask({.url = server.url("/image")}, stalled.completion()));
      downloads.back()->resume();
    }
    for (int i = 0; i < 3; ++i) {
      EXPECT_EQ(loadURL(*session, {.url = server.url("/")}).text(), "hello");
    }
    EXPECT_EQ(stalled.count(), 0u);
    for (const auto& download : downloads) download->cancel();
    stalled.wait(kDownloads);
  }
}

}  // namespace
}  // namespace zelkord
