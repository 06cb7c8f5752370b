#include <gtest/gtest.h>

#include <atomic>
#include <string>
#include <utility>

#include "platform/linux/url/URLSessionTestSupport.h"
#include "platform/linux/url_cache/CachingURLSession.h"
#include "platform/testing/RecordingLog.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestHTTPServer.h"

namespace zelkord {
namespace {

const HTTPHeaders kFreshForAMinute = {{"Cache-Control", "max-age=60"}};
const HTTPHeaders kStaleWithTag = {{"Cache-Control", "max-age=0"}, {"ETag", "\"1\""}, {"X", "old"}};

class CachingURLSessionTest : public ::testing::Test {
 protected:
  // The last to let go of a session may be a worker, which needs the queues for it.
  void TearDown() override {
    session_.reset();
    for (int i = 0; i < 10'000 && isBusy(); ++i) std::this_thread::sleep_for(1ms);
  }
  bool isBusy() const {
    const auto workers = bed_.queues.workers();
    return workers.running + workers.blocked > 0;
  }

  URLOutcome load(const std::string& path, HTTPHeaders headers = {}, std::string method = "GET") {
    return loadURL(*session_,
                   {.url = server_.url(path), .method = method, .headers = std::move(headers)});
  }
  std::string text(const std::string& path, HTTPHeaders headers = {}) {
    return load(path, std::move(headers)).text();
  }
  // What the server was asked with last.
  std::string askedWith(const char* header) {
    return server_.requests().back().header(header).value_or("");
  }
  std::size_t asked() { return server_.requests().size(); }
  void reply(const char* path, int status, std::string body, HTTPHeaders headers = {}) {
    server_.reply(path, TestHTTPReply::make(status, std::move(body), std::move(headers)));
  }
  std::shared_ptr<URLSession> makeSession() {
    return bed_.make(
        {.name = "cached", .cache = URLSessionConfiguration::Cache{1 << 20, 10 << 20, 16'384}});
  }

  TestHTTPServer server_;
  TemporaryDirectory state_;
  LinuxClock clock_;
  RecordingLog log_;
  URLSessionTestBed bed_{
      {.cache = CurlURLSessions::Services::CacheHost{clock_, log_, state_ / "urlcache"}}};
  std::shared_ptr<URLSession> session_ = makeSession();
};

TEST_F(CachingURLSessionTest, AnswersFromTheCacheWhileFresh) {
  reply("/", 404, "gone for now", kFreshForAMinute);
  reply("/", 200, "new");
  EXPECT_EQ(text("/?q=a"), "gone for now");
  for (const char* when : {"from memory", "from disk", "from memory again"}) {
    SCOPED_TRACE(when);
    const auto outcome = load("/?q=a#fragment");
    EXPECT_EQ(outcome.text(), "gone for now");
    EXPECT_EQ(outcome.result.status(), 404);
    EXPECT_EQ(outcome.result.response->url, server_.url("/?q=a#fragment"));
    EXPECT_EQ(outcome.result.response->header("Age"), "0");
    EXPECT_EQ(outcome.request.url, server_.url("/?q=a#fragment"));
    EXPECT_LT(outcome.timing.requestStart, 0);
    EXPECT_EQ(outcome.timing.bytesReceived, 0);
    if (std::string_view(when) == "from memory") session_->purgeMemoryCache();
  }
  EXPECT_EQ(asked(), 1u);
  EXPECT_EQ(text("/?q=b"), "new");
}

TEST_F(CachingURLSessionTest, GoesToTheNetworkWhenTheCacheMayNotAnswer) {
  const struct {
    const char* name;
    HTTPHeaders stored;
    URLRequest first;
    URLRequest second;
  } cases[] = {
      {"nothing said", {}, {}, {}},
      {"no-store", {{"Cache-Control", "no-store, max-age=60"}}, {}, {}},
      {"other variant",
       {{"Cache-Control", "max-age=60"}, {"Vary", "X-A"}},
       {.headers = {{"X-A", "1"}}},
       {.headers = {{"X-A", "2"}}}},
      {"varies with all", {{"Cache-Control", "max-age=60"}, {"Vary", "*"}}, {}, {}},
      {"told to reload", kFreshForAMinute, {}, {.headers = {{"Cache-Control", "no-cache"}}}},
      {"ignores the cache",
       {{"Cache-Control", "max-age=60"}, {"ETag", "\"1\""}},
       {},
       {.cachePolicy = CachePolicy::ReloadIgnoringLocalCache}},
      {"authorized", kFreshForAMinute, {.headers = {{"Authorization", "x"}}}, {}},
      {"range", kFreshForAMinute, {.headers = {{"Range", "bytes=0-1"}}}, {}},
      {"not to be stored", kFreshForAMinute, {.headers = {{"Cache-Control", "no-store"}}}, {}},
      {"posted", kFreshForAMinute, {.method = "POST"}, {}},
      {"changed by a post", kFreshForAMinute, {}, {.method = "POST"}},
  };
  for (auto [name, stored, first, second] : cases) {
    SCOPED_TRACE(name);
    const auto before = asked();
    const auto path = "/" + std::to_string(before);
    for (const char* body : {"1", "2", "3"}) reply(path.c_str(), 200, body, stored);
    first.url = second.url = server_.url(path);
    EXPECT_EQ(loadURL(*session_, first).text(), "1");
    EXPECT_EQ(loadURL(*session_, second).text(), "2");
    EXPECT_EQ(askedWith("If-None-Match"), "");
    EXPECT_EQ(asked(), before + 2);
    if (std::string_view(name) == "changed by a post") {
      EXPECT_EQ(text(path), "3");
    }
  }
}

TEST_F(CachingURLSessionTest, AsksWhetherAStaleResponseIsStillRight) {
  const std::string date = "Sun, 22 Nov 2020 12:00:00 GMT";
  auto headers = kStaleWithTag;
  headers.emplace_back("Last-Modified", date);
  reply("/", 200, "kept", headers);
  reply("/", 304, "", {{"Cache-Control", "max-age=60"}, {"X", "new"}});
  EXPECT_EQ(text("/"), "kept");
  const auto outcome = load("/", {{"A", "b"}});
  EXPECT_EQ(askedWith("If-None-Match"), "\"1\"");
  EXPECT_EQ(askedWith("If-Modified-Since"), date);
  EXPECT_EQ(outcome.result.status(), 200);
  EXPECT_EQ(outcome.text(), "kept");
  EXPECT_EQ(outcome.result.response->header("X"), "new");
  EXPECT_EQ(outcome.request.headers, (HTTPHeaders{{"A", "b"}}));
  EXPECT_GE(outcome.timing.responseEnd, 0);
  EXPECT_EQ(text("/"), "kept") << "fresh again";
  EXPECT_EQ(asked(), 2u);
}

TEST_F(CachingURLSessionTest, TakesWhatComesInsteadOfA304) {
  const struct {
    const char* path;
    std::vector<TestHTTPReply> replies;
    std::vector<std::string> bodies;  // of one task after the other
  } cases[] = {
      {"/changed",
       {TestHTTPReply::make(200, "1", kStaleWithTag),
        TestHTTPReply::make(200, "2", kFreshForAMinute)},
       {"1", "2", "2"}},
      {"/no-longer-kept",
       {TestHTTPReply::make(200, "1", kStaleWithTag), TestHTTPReply::make(200, "2"),
        TestHTTPReply::make(304)},
       {"1", "2", ""}},
      {"/fails",
       {TestHTTPReply::make(200, "1", kStaleWithTag), TestHTTPReply::make(503, "later"),
        TestHTTPReply::make(304)},
       {"1", "later", "1"}},
      {"/another-304",
       {TestHTTPReply::make(200, "1", kStaleWithTag),
        TestHTTPReply::make(304, "", {{"ETag", "\"2\""}}), TestHTTPReply::make(200, "2")},
       {"1", "2", "2"}},
      {"/not-to-be-kept-any-more",
       {TestHTTPReply::make(200, "1", kStaleWithTag),
        TestHTTPReply::make(304, "", {{"Cache-Control", "no-store"}}), TestHTTPReply::make(304)},
       {"1", "1", ""}},
      {"/varies-with-all-now",
       {TestHTTPReply::make(200, "1", kStaleWithTag), TestHTTPReply::make(304, "", {{"Vary", "*"}}),
        TestHTTPReply::make(304)},
       {"1", "1", ""}},
      {"/redirected-304",
       {TestHTTPReply::make(200, "1", kStaleWithTag), TestHTTPReply::redirect(302, "/not-modified"),
        TestHTTPReply::make(200, "2")},
       {"1", "2", "2"}},
      {"/cut",
       {TestHTTPReply::truncated("HTTP/1.1 200 OK\r\nCache-Control: max-age=60\r\n", 50),
        TestHTTPReply::make(200, "whole")},
       {"*", "whole"}},
  };
  reply("/not-modified", 304, "", {{"ETag", "\"1\""}});
  for (const auto& [path, replies, bodies] : cases) {
    SCOPED_TRACE(path);
    for (const auto& one : replies) server_.reply(path, one);
    for (const auto& body : bodies) {
      const auto outcome = load(path);
      if (body != "*") {
        EXPECT_EQ(outcome.text(), body);
      }
      EXPECT_EQ(outcome.request.headers, HTTPHeaders{});
    }
  }
}

TEST_F(CachingURLSessionTest, LeavesRequestsWithConditionsAlone) {
  reply("/", 200, "kept", {{"Cache-Control", "max-age=60"}, {"ETag", "\"1\""}});
  reply("/", 304, "");
  load("/");
  const auto outcome = load("/", {{"If-None-Match", "\"0\""}});
  EXPECT_EQ(outcome.result.status(), 304);
  EXPECT_EQ(askedWith("If-None-Match"), "\"0\"");
  EXPECT_EQ(askedWith("If-Modified-Since"), "");
  EXPECT_EQ(text("/"), "kept");
}

TEST_F(CachingURLSessionTest, KeepsARedirectedResponseUnderItsOwnURL) {
  server_.reply("/from", TestHTTPReply::redirect(302, "/to"));
  reply("/to", 200, "there", kFreshForAMinute);
  EXPECT_EQ(text("/from"), "there");
  EXPECT_EQ(text("/to"), "there");
  EXPECT_EQ(text("/from"), "there");
  EXPECT_EQ(asked(), 4u);
}

TEST_F(CachingURLSessionTest, KeepsWhatIsStoredByHandApart) {
  auto headers = kFreshForAMinute;
  headers.emplace_back("ETag", "\"theirs\"");
  reply("/", 200, "network", kFreshForAMinute);
  const URLRequest request{.url = server_.url("/")};
  session_->cache()->store(request, {{request.url, 200, headers}, Data("by hand")});
  EXPECT_EQ(text("/"), "network");
  EXPECT_EQ(askedWith("If-None-Match"), "");
  EXPECT_EQ(text("/"), "network");
  EXPECT_EQ(asked(), 1u);
  EXPECT_EQ(session_->cache()->lookup(request)->data.view(), "by hand");
}

TEST_F(CachingURLSessionTest, DownloadsPastTheCache) {
  reply("/", 200, "data", kFreshForAMinute);
  load("/");
  URLResults results;
  session_->downloadTask({.url = server_.url("/")}, results.completion())->resume();
  EXPECT_TRUE(results.wait(1).front().file);
  EXPECT_EQ(asked(), 2u);
}

TEST_F(CachingURLSessionTest, CompletesOnceWheneverItIsCancelled) {
  reply("/fresh", 200, "kept", kFreshForAMinute);
  reply("/stale", 200, "kept", kStaleWithTag);
  server_.reply("/stale", TestHTTPReply::hanging());
  load("/fresh");
  load("/stale");
  for (const char* path : {"/fresh", "/stale"}) {
    for (const bool purged : {false, true}) {
      for (const int microseconds : {-1, 0, 50, 500}) {
        SCOPED_TRACE(std::string(path) + (purged ? " purged " : " ") +
                     std::to_string(microseconds));
        if (purged) session_->purgeMemoryCache();
        URLResults results;
        const auto task = session_->dataTask({.url = server_.url(path)}, results.completion());
        if (microseconds >= 0) task->resume();
        if (microseconds > 0) std::this_thread::sleep_for(std::chrono::microseconds(microseconds));
        task->cancel();
        task->cancel();
        task->resume();
        const auto code = results.wait(1).front().error.value_or(Error()).code;
        EXPECT_TRUE(code == -999 ||
                    (code == 0 && microseconds >= 0 && path == std::string("/fresh")))
            << code;
        load("/fresh");  // whatever else the delegate queue has to do
        EXPECT_EQ(results.count(), 1u);
      }
    }
  }
}

TEST_F(CachingURLSessionTest, RunsCompletionsOneAtATimeAndNeverInline) {
  reply("/fresh", 200, "kept", kFreshForAMinute);
  reply("/other", 200, "other");
  load("/fresh");
  URLResults results;
  std::atomic<int> running = 0;
  std::atomic<bool> overlapped = false, inlined = false;
  const auto thread = std::this_thread::get_id();
  for (int i = 0; i < 50; ++i) {
    const auto task =
        session_->dataTask({.url = server_.url(i % 2 ? "/fresh" : "/other")},
                           [&, done = results.completion()](
                               const std::shared_ptr<URLTask>& finished, const auto& result) {
                             if (++running > 1) overlapped = true;
                             if (std::this_thread::get_id() == thread) inlined = true;
                             std::this_thread::yield();
                             --running;
                             done(finished, result);
                           });
    task->resume();
  }
  results.wait(50);
  EXPECT_FALSE(overlapped);
  EXPECT_FALSE(inlined);
}

TEST_F(CachingURLSessionTest, EndsWithTasksUnderWay) {
  for (const char* path : {"/loading", "/looking"}) {
    SCOPED_TRACE(path);
    reply(path, 200, "kept", kStaleWithTag);
    server_.reply(path, TestHTTPReply::hanging());
    load(path);
    session_->purgeMemoryCache();
    const auto before = asked();
    const auto probe = std::make_shared<int>(0);
    for (int i = 0; i < 4; ++i) {
      const auto task =
          session_->dataTask({.url = server_.url(path)}, [probe](const auto&, const auto&) {});
      task->resume();
    }
    if (std::string_view(path) == "/loading") {
      EXPECT_TRUE(server_.waitForRequests(before + 4));
    }
    session_.reset();
    // One that is looking may hold the session for a moment longer.
    for (int i = 0; i < 10'000 && probe.use_count() > 1; ++i) std::this_thread::sleep_for(1ms);
    EXPECT_EQ(probe.use_count(), 1) << "the completions are gone";
    session_ = makeSession();
  }
}

}  // namespace
}  // namespace zelkord
