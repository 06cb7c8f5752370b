#include <gtest/gtest.h>

#include <atomic>
#include <map>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "platform/linux/url/URLSessionTestSupport.h"
#include "platform/linux/url_cache/CachingURLSession.h"
#include "platform/testing/RecordingLog.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestHTTPServer.h"

// What a server that sees every byte can join of the lives of several identities: nothing.

namespace zelkord {
namespace {

constexpr const char* kWho = "X-Who";
const std::string kDate = "Sun, 22 Nov 2020 12:00:00 GMT";

// A body and validators that say whose they are. "/close" closes its connection, "/fresh" may be
// cached, all else only with a question.
TestHTTPReply answerToIdentity(const TestHTTPRequest& request) {
  const auto who = request.header(kWho).value_or("nobody");
  const bool isFresh = request.target.starts_with("/fresh");
  auto reply = TestHTTPReply::make(200, who,
                                   {{"Cache-Control", isFresh ? "max-age=600" : "max-age=0"},
                                    {"ETag", "\"" + who + "\""},
                                    {"Last-Modified", kDate}});
  if (request.target == "/close") reply.ending = TestHTTPReply::Ending::Close;
  if (request.target == "/slow") reply = reply.dripping(reply.bytes.size(), 300ms);
  return reply;
}

class URLIdentityTest : public ::testing::Test {
 protected:
  URLIdentityTest() { server_.answerWith(answerToIdentity); }
  // The last to let go of a session may be a worker, which needs the queues for it.
  void TearDown() override {
    session_.reset();
    for (int i = 0; i < 10'000 && isBusy(); ++i) std::this_thread::sleep_for(1ms);
  }
  bool isBusy() const {
    const auto workers = bed_.queues.workers();
    return workers.running + workers.blocked > 0;
  }

  URLRequest request(const std::string& path, const std::string& who) const {
    URLRequest request{.url = server_.url(path), .timeout = 20s};
    if (!who.empty()) request.headers.emplace_back(kWho, who);
    return request;
  }
  std::string load(const std::string& path, const std::string& who) {
    return loadURL(*session_, request(path, who)).text();
  }
  // No connection and no TLS session served two identities, and nobody was asked with another's
  // validator.
  void expectNothingJoined() const {
    std::map<int, std::set<std::string>> byConnection;
    for (const auto& request : server_.requests()) {
      const auto who = request.header(kWho).value_or("");
      const auto tag = request.header("If-None-Match").value_or("");
      EXPECT_TRUE(tag.empty() || tag == "\"" + (who.empty() ? "nobody" : who) + "\"") << who << tag;
      for (const int connection : {request.connection, request.resumedFrom}) {
        if (!who.empty() && connection > 0) byConnection[connection].insert(who);
      }
    }
    for (const auto& [connection, whose] : byConnection) {
      EXPECT_EQ(whose.size(), 1u) << "connection " << connection;
    }
  }
  std::size_t asked() const { return server_.requests().size(); }

  const TestCertificate certificate_ = TestCertificate::make("127.0.0.1");
  const URLTestFile roots_{certificate_.certificate};
  TestHTTPServer server_{certificate_};
  TemporaryDirectory state_;
  LinuxClock clock_;
  RecordingLog log_;
  URLSessionTestBed bed_{
      {.rootsFile = roots_.path(),
       .cache = CurlURLSessions::Services::CacheHost{clock_, log_, state_ / "urlcache"}}};
  std::shared_ptr<URLSession> session_ =
      bed_.make({.name = "test",
                 .cache = URLSessionConfiguration::Cache{1 << 20, 10 << 20, 16'384},
                 .identityHeader = kWho,
                 .pipelining = true,
                 .tlsSessionTickets = true});
};

TEST_F(URLIdentityTest, ThreeIdentitiesShareNothing) {
  std::string before;
  for (const std::string who : {"a", "b", "c"}) {
    SCOPED_TRACE(who);
    const auto first = asked();
    if (!before.empty()) session_->endIdentity(before);
    before = who;
    load("/warm", "");
    for (const char* path : {"/", "/", "/fresh", "/fresh", "/close", "/close", "/"}) {
      EXPECT_EQ(load(path, who), who);
    }
    const auto requests = server_.requests();
    ASSERT_EQ(requests.size(), first + 7) << "one of them from the cache";
    EXPECT_EQ(requests[first].resumedFrom, 0);
    EXPECT_EQ(requests[first + 1].header("If-None-Match"), std::nullopt);
    EXPECT_EQ(requests[first + 1].header("If-Modified-Since"), std::nullopt);
    // Within one life all that is used.
    EXPECT_EQ(requests[first].connection, requests[first + 1].connection);
    EXPECT_EQ(requests[first + 2].header("If-None-Match"), "\"" + who + "\"");
    EXPECT_GE(requests[first + 6].resumedFrom, requests[first].connection);
    for (auto i = first; i < requests.size(); ++i) {
      EXPECT_TRUE(requests[i].resumedFrom == 0 ||
                  requests[i].resumedFrom >= requests[first].connection);
    }
  }
  expectNothingJoined();
  EXPECT_TRUE(server_.waitForCloses(4)) << "two of the first, two of the second";
}

TEST_F(URLIdentityTest, IdentitiesThatLiveAtTheSameTimeShareNothing) {
  for (int round = 0; round < 3; ++round) {
    for (const std::string who : {"a", "b"}) {
      EXPECT_EQ(load("/", who), who);
      EXPECT_EQ(load("/fresh", who), who);
    }
  }
  expectNothingJoined();
  EXPECT_EQ(server_.connections(), 2);
}

TEST_F(URLIdentityTest, WhatIsUnderWayEndsAloneAndLeavesNothing) {
  URLResults results;
  const auto running = session_->dataTask(request("/slow", "a"), results.completion());
  const auto made = session_->dataTask(request("/made", "a"), results.completion());
  const auto nobodys = session_->dataTask(request("/nobodys", ""), results.completion());
  running->resume();
  ASSERT_TRUE(server_.waitForRequests(1));
  session_->endIdentity("a");
  EXPECT_EQ(load("/", "b"), "b");
  made->resume();
  nobodys->resume();
  results.wait(3);
  EXPECT_EQ(load("/", "b"), "b");
  EXPECT_TRUE(server_.waitForCloses(3)) << "theirs";
  for (const char* path : {"/slow", "/made", "/nobodys"}) load(path, "a");
  std::set<int> connections;
  for (const auto& request : server_.requests()) {
    connections.insert(request.connection);
    if (request.header(kWho) != "b") {
      EXPECT_EQ(request.header("If-None-Match"), std::nullopt) << request.target;
      EXPECT_EQ(request.resumedFrom, 0) << request.target;
    }
  }
  EXPECT_EQ(connections.size(), 7u) << "one of b, one for each of the others";
  expectNothingJoined();
}

TEST_F(URLIdentityTest, NothingIsJoinedWhileThreadsLoadAndIdentitiesChange) {
  constexpr int kLives = 12;
  constexpr std::size_t kRequestsOfALife = 8;
  std::atomic<int> life = 0;
  std::atomic<bool> wrong = false;
  std::vector<std::thread> threads;
  for (int thread = 0; thread < 4; ++thread) {
    threads.emplace_back([&, thread] {
      const char* const paths[] = {"/", "/fresh", "/close"};
      for (int i = thread; life < kLives; ++i) {
        const auto who = i % 7 == 0 ? "" : "id" + std::to_string(life);
        const auto text = load(paths[i % 3], who);
        if (text != (who.empty() ? "nobody" : who)) wrong = true;
      }
    });
  }
  while (life < kLives) {
    if (!server_.waitForRequests(static_cast<std::size_t>(life + 1) * kRequestsOfALife)) break;
    session_->endIdentity("id" + std::to_string(life++));
  }
  const bool lived = life.exchange(kLives) == kLives;
  for (auto& thread : threads) thread.join();
  EXPECT_TRUE(lived && !wrong);
  expectNothingJoined();
}

}  // namespace
}  // namespace zelkord
