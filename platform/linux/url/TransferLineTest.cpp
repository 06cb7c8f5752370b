#include <gtest/gtest.h>
#include <sys/resource.h>

#include <memory>
#include <string>
#include <vector>

#include "platform/linux/url/URLSessionTestSupport.h"
#include "platform/testing/FakeCounters.h"
#include "platform/testing/RecordingLog.h"
#include "platform/testing/TestHTTPServer.h"

namespace zelkord {
namespace {

// The process's soft limit of descriptors, for the length of a test.
class DescriptorLimit {
 public:
  explicit DescriptorLimit(rlim_t soft) {
    getrlimit(RLIMIT_NOFILE, &before_);
    auto now = before_;
    now.rlim_cur = std::min(soft, before_.rlim_max);
    setrlimit(RLIMIT_NOFILE, &now);
  }
  ~DescriptorLimit() { setrlimit(RLIMIT_NOFILE, &before_); }
  DescriptorLimit(const DescriptorLimit&) = delete;
  DescriptorLimit& operator=(const DescriptorLimit&) = delete;

 private:
  rlimit before_{};
};

struct ReportsBed {
  LinuxClock clock;
  FakeCounters counters;
  RecordingLog log;
  LimitReports reports{clock, counters, Logger(log, "")};

  std::int64_t counted(const char* name) {
    return counters.value(std::string("com.quenta.zelkord.limit.") + name);
  }
};

using Tasks = std::vector<std::shared_ptr<URLTask>>;

void start(Tasks& tasks, URLSession& session, const URLRequest& request, URLResults& results,
           std::size_t count = 1) {
  for (std::size_t i = 0; i < count; ++i) {
    tasks.push_back(session.dataTask(request, results.completion()));
    tasks.back()->resume();
  }
}

TEST(TransferLineTest, AStalledHostLeavesRoomForOthersAndForWhatIsTyped) {
  const DescriptorLimit limit(1024);
  ReportsBed reports;
  TestHTTPServer stalled, healthy;
  stalled.reply("/card", TestHTTPReply::hanging());
  stalled.reply("/search", TestHTTPReply::make(200, "typed"));
  healthy.reply("/", TestHTTPReply::make(200, "healthy"));
  URLSessionTestBed bed({.reports = &reports.reports});
  const auto session = bed.make();
  URLResults cards;
  Tasks tasks;
  start(tasks, *session,
        {.url = stalled.url("/card"), .timeout = 20s, .priority = TransferPriority::Low}, cards,
        1020);
  for (int i = 0; i < 5; ++i) {
    for (const auto priority : {TransferPriority::Normal, TransferPriority::Low}) {
      const auto outcome =
          loadURL(*session, {.url = healthy.url("/"), .timeout = 2s, .priority = priority});
      EXPECT_EQ(outcome.text(), "healthy");
    }
    EXPECT_EQ(loadURL(*session, {.url = stalled.url("/search"), .timeout = 2s}).text(), "typed");
  }
  EXPECT_EQ(cards.count(), 0u) << "they wait";
  EXPECT_LT(stalled.connections(), 40);
  EXPECT_GT(reports.counted("transfers"), 900);
  for (const auto& task : tasks) task->cancel();
  for (const auto& result : cards.wait(1020)) EXPECT_EQ(result.error->code, -999);
  EXPECT_EQ(loadURL(*session, {.url = stalled.url("/search")}).text(), "typed");
}

TEST(TransferLineTest, ServesInTheOrderOfArrivalAndOfPriority) {
  TestHTTPServer server;
  server.answerWith(
      [](const TestHTTPRequest&) { return TestHTTPReply::make(200, "hello").dripping(50, 20ms); });
  auto limits = TransferLimits::of(1024);
  limits.transfers = {1, 1};
  limits.patientTransfers = {1, 1};
  URLSessionTestBed bed({.limits = limits});
  const auto session = bed.make();
  const auto other = bed.make({.name = "other"});
  URLResults results;
  Tasks tasks;
  const auto request = [&](const char* path, TransferPriority priority) {
    return URLRequest{.url = server.url(path), .priority = priority};
  };
  start(tasks, *session, request("/1", TransferPriority::Low), results);
  start(tasks, *session, request("/4", TransferPriority::Low), results);
  start(tasks, *other, request("/2", TransferPriority::Normal), results);
  start(tasks, *session, request("/5", TransferPriority::Low), results);
  start(tasks, *session, request("/3", TransferPriority::Normal), results);
  for (const auto& result : results.wait(5)) EXPECT_EQ(result.status(), 200);
  std::string order;
  for (const auto& asked : server.requests()) order += asked.target;
  EXPECT_EQ(order, "/1/2/3/4/5");
}

TEST(TransferLineTest, EndsWhatWaitsTooLongIsCancelledOrFindsTheLineFull) {
  ReportsBed reports;
  TestHTTPServer server;
  server.reply("/stuck", TestHTTPReply::hanging());
  server.reply("/", TestHTTPReply::make(200, "hello"));
  auto limits = TransferLimits::of(1024);
  limits.transfers = {2, 1};
  limits.waiting = {3, 3};
  URLSessionTestBed bed({.limits = limits, .reports = &reports.reports});
  const auto session = bed.make();
  URLResults results;
  Tasks tasks;
  start(tasks, *session, {.url = server.url("/stuck")}, results);
  ASSERT_TRUE(server.waitForRequests(1));
  start(tasks, *session, {.url = server.url("/"), .timeout = 100ms}, results);
  start(tasks, *session, {.url = server.url("/")}, results, 2);
  start(tasks, *session, {.url = server.url("/")}, results);
  auto ended = results.wait(2);
  EXPECT_EQ(ended[0].error->code, -1004) << "no room in the line";
  EXPECT_EQ(ended[1].error->code, -1001);
  tasks[2]->cancel();
  EXPECT_EQ(results.wait(3)[2].error->code, -999);
  EXPECT_EQ(results.count(), 3u);
  tasks[0]->cancel();
  ended = results.wait(5);
  EXPECT_EQ(ended[4].status() + ended[3].status(), 200) << "it has got the place";
  EXPECT_EQ(reports.counted("waiting_transfers"), 1);
  EXPECT_EQ(server.requests().size(), 2u);
}

TEST(TransferLineTest, SessionsAndLoadingEndWhileTasksWait) {
  TestHTTPServer server;
  server.reply("/stuck", TestHTTPReply::hanging());
  auto limits = TransferLimits::of(1024);
  limits.transfers = {1, 1};
  URLResults ofEnded, ofOther;
  Tasks tasks;
  {
    URLSessionTestBed bed({.limits = limits});
    auto session = bed.make();
    const auto other = bed.make({.name = "other"});
    start(tasks, *session, {.url = server.url("/stuck")}, ofEnded, 3);
    ASSERT_TRUE(server.waitForRequests(1));
    start(tasks, *other, {.url = server.url("/stuck")}, ofOther, 2);
    session.reset();
    ASSERT_TRUE(server.waitForRequests(2)) << "the place is free again";
    CurlURLSessions stopped(bed.queues, {.limits = limits});
    const auto last = stopped.make({.name = "last"});
  }
  EXPECT_EQ(ofEnded.count(), 0u);
}

TEST(TransferLimitsTest, FitIntoTheDescriptorsThatThereAre) {
  for (const std::uint64_t descriptors : {256u, 1024u, 4096u, 65'536u}) {
    SCOPED_TRACE(descriptors);
    const auto limits = TransferLimits::of(descriptors);
    // Two connections and a look-up each, and what two sessions keep.
    const auto most =
        limits.transfers.inAll * 4 + static_cast<std::uint64_t>(limits.idleConnections) * 2;
    EXPECT_LE(most, descriptors * 3 / 4);
    EXPECT_EQ(limits.transfers.ofOneHolder, limits.transfers.inAll / 4);
    EXPECT_LT(limits.patientTransfers.ofOneHolder, limits.transfers.ofOneHolder);
  }
}

}  // namespace
}  // namespace zelkord
