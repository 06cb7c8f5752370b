#include <gtest/gtest.h>

#include <atomic>
#include <memory>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "platform/linux/url/URLSessionTestSupport.h"
#include "platform/testing/FakeURLSession.h"
#include "platform/testing/ManualTimeline.h"
#include "platform/testing/TestHTTPServer.h"

// What every user of a URL session relies on, run on the real sessions and on the fake ones.

namespace zelkord {
namespace {

// A session whose "/hello" answers and whose "/silent" does not.
class SessionHost {
 public:
  virtual ~SessionHost() = default;
  virtual std::shared_ptr<URLSession>& session() = 0;
  virtual std::string url(const std::string& path) const = 0;
  // Lets the tasks go on until that many have completed, or for as long as there is work.
  virtual void settle(std::size_t completed) = 0;

  URLCompletion completion() {
    return [this](const std::shared_ptr<URLTask>&, const URLResult& result) {
      const MutexLock lock(mutex_);
      results_.push_back(result);
    };
  }
  std::vector<URLResult> results() const {
    const MutexLock lock(mutex_);
    return results_;
  }

 private:
  mutable Mutex mutex_;
  std::vector<URLResult> results_ ZK_GUARDED_BY(mutex_);
};

class FakeSessionHost final : public SessionHost {
 public:
  FakeSessionHost() {
    const auto fake = std::make_shared<FakeURLSession>(timeline_, URLSessionConfiguration{});
    session_ = fake;
    fake->setOnResume([](FakeURLTask& task) {
      if (task.request().url.ends_with("/hello")) task.succeed(200, "hello", {{"X-Its", "own"}});
    });
  }
  std::shared_ptr<URLSession>& session() override { return session_; }
  std::string url(const std::string& path) const override { return "https://a.example" + path; }
  void settle(std::size_t) override { timeline_.runUntilIdle(); }

 private:
  ManualTimeline timeline_;
  std::shared_ptr<URLSession> session_;
};

class CurlSessionHost final : public SessionHost {
 public:
  CurlSessionHost() {
    server_.reply("/hello", TestHTTPReply::make(200, "hello", {{"X-Its", "own"}}));
    server_.reply("/silent", TestHTTPReply::hanging());
  }
  std::shared_ptr<URLSession>& session() override { return session_; }
  std::string url(const std::string& path) const override { return server_.url(path); }
  void settle(std::size_t completed) override {
    const auto limit = steadyNow() + 20s;
    while (results().size() < completed && steadyNow() < limit) std::this_thread::sleep_for(1ms);
    std::this_thread::sleep_for(20ms);  // for what must not come
  }

 private:
  TestHTTPServer server_;
  URLSessionTestBed bed_;
  std::shared_ptr<URLSession> session_ = bed_.make();
};

enum class SessionKind { Fake, Curl };

class URLSessionContract : public testing::TestWithParam<SessionKind> {
 protected:
  URLSessionContract() {
    if (GetParam() == SessionKind::Fake) {
      host_ = std::make_unique<FakeSessionHost>();
    } else {
      host_ = std::make_unique<CurlSessionHost>();
    }
  }
  std::shared_ptr<URLTask> make(const char* path) {
    return host_->session()->dataTask({.url = host_->url(path)}, host_->completion());
  }
  std::int64_t code(std::size_t place) const {
    const auto results = host_->results();
    const auto error = place < results.size() ? results[place].error : std::nullopt;
    return error ? error->code : 0;
  }

  std::unique_ptr<SessionHost> host_;
};

TEST_P(URLSessionContract, ATaskCompletesOnceAfterItWasResumed) {
  const auto task = make("/hello");
  host_->settle(0);
  EXPECT_TRUE(host_->results().empty());
  task->resume();
  task->resume();
  host_->settle(1);
  task->resume();
  task->cancel();
  host_->settle(1);
  ASSERT_EQ(host_->results().size(), 1u);
  const auto result = host_->results().front();
  EXPECT_FALSE(result.error || result.file);
  EXPECT_EQ(result.status(), 200);
  EXPECT_EQ(result.data.value_or(Data()).view(), "hello");
  EXPECT_EQ(result.response->url, host_->url("/hello"));
  EXPECT_EQ(result.response->header("x-its"), "own");
  EXPECT_EQ(task->currentRequest().url, host_->url("/hello"));
}

TEST_P(URLSessionContract, ACancelledTaskCompletesOnceWithThat) {
  const auto suspended = make("/hello");
  suspended->cancel();
  suspended->resume();
  const auto running = make("/silent");
  running->resume();
  running->cancel();
  running->cancel();
  host_->settle(2);
  ASSERT_EQ(host_->results().size(), 2u);
  EXPECT_EQ(code(0), -999);
  EXPECT_EQ(code(1), -999);
  EXPECT_FALSE(host_->results()[0].response || host_->results()[1].response);
}

TEST_P(URLSessionContract, ASessionHoldsItsTasksAndItsEndDropsThem) {
  make("/hello")->resume();
  host_->settle(1);
  EXPECT_EQ(host_->results().size(), 1u) << "nobody else held the task";
  const auto held = make("/silent");
  held->resume();
  host_->session().reset();
  held->cancel();
  host_->settle(1);
  EXPECT_EQ(host_->results().size(), 1u);
  EXPECT_EQ(held->currentRequest().url, host_->url("/silent"));
}

TEST_P(URLSessionContract, WithoutAProxyThereIsNothingToKnowOfOne) {
  const auto task = make("/hello");
  EXPECT_TRUE(task->enableProxy(nullptr)) << "the request is not routed";
  task->resume();
  host_->settle(1);
  std::atomic<bool> asked = false;
  task->connectionInformation([&](const auto& information) { asked = !information; });
  for (int i = 0; i < 1000 && !asked; ++i) host_->settle(1);
  EXPECT_TRUE(asked);
  EXPECT_EQ(host_->session()->cache(), nullptr);
}

INSTANTIATE_TEST_SUITE_P(FakeAndReal, URLSessionContract,
                         testing::Values(SessionKind::Fake, SessionKind::Curl),
                         [](const auto& kind) {
                           return kind.param == SessionKind::Fake ? "Fake" : "Curl";
                         });

}  // namespace
}  // namespace zelkord
