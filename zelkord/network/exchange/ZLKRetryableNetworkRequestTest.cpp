#include <gtest/gtest.h>

#include "platform/testing/FakeURLSession.h"
#include "platform/testing/ManualTimeline.h"
#include "zelkord/network/exchange/ZLKRetryableNetworkRequest.h"

namespace zelkord {
namespace {

class ZLKRetryableNetworkRequestTest : public testing::Test {
 protected:
  struct Run {
    unsigned retries = 5;
    std::optional<Duration> deadline;
    bool delayOnFail = false;
  };

  // Every attempt fails after `takes`, telling its number, up to the one that `answers`.
  void perform(const Run& run, Duration takes = {}, std::size_t answers = 0) {
    session_.setOnResume([this, takes, answers](FakeURLTask& task) {
      const auto number = session_.tasks().size();
      attempts_.push_back(timeline_.now());
      replies_.push_back(replyQueue_.after(takes, [this, number, answers, &task] {
        if (number == answers) return task.succeed(500, "body");
        task.fail(urlError(URLErrorCode::ConnectionLost, std::to_string(number)));
        // What a wall clock does must not matter.
        timeline_.setWall(timeline_.wallNow() - 24h);
      }));
    });
    ZLKRetryableNetworkRequest request{{.url = "https://h/"}, std::nullopt, run.delayOnFail};
    if (run.deadline) request.expire = timeline_.now() + *run.deadline;
    dataTaskWithRetryableRequest(
        session_, std::make_shared<const ZLKRetryableNetworkRequest>(std::move(request)), 1,
        run.retries,
        [this](const std::shared_ptr<URLTask>&, const URLResult& result) {
          results_.push_back(result);
        },
        {timeline_, timeline_})
        ->resume();
    timeline_.advance(1h);
  }

  ManualTimeline timeline_;
  FakeURLSession session_{timeline_, {}};
  WorkQueue& replyQueue_ = timeline_.global(QualityOfService::Default);
  std::vector<Subscription> replies_;
  std::vector<SteadyTime> attempts_;
  std::vector<URLResult> results_;
};

TEST_F(ZLKRetryableNetworkRequestTest, RepeatsFailuresUntilRetriesOrDeadlineRunOut) {
  struct Case {
    std::string_view name;
    Run run;
    Duration takes;
    std::size_t attempts;
  };
  const Case cases[] = {
      {"no deadline", {5, std::nullopt, true}, 0s, 1},
      {"retries run out", {5, 1h, true}, 0s, 6},
      {"no retries", {0, 1h, false}, 0s, 1},
      {"deadline passed in the first attempt", {5, 10s, false}, 11s, 1},
      {"at the deadline itself", {5, 10s, false}, 10s, 2},
      {"deadline passed by the delays", {5, 4s, true}, 0s, 4},
  };
  for (const auto& test : cases) {
    SCOPED_TRACE(test.name);
    session_.forgetTasks();
    results_.clear();
    perform(test.run, test.takes);
    EXPECT_EQ(session_.tasks().size(), test.attempts);
    ASSERT_EQ(results_.size(), 1u);
    EXPECT_EQ(results_[0].error->reason(), std::to_string(test.attempts));
  }
}

TEST_F(ZLKRetryableNetworkRequestTest, WaitsBetweenAttemptsOnlyWhenAsked) {
  perform({2, 1h, true});
  perform({2, 1h, false});
  const auto start = attempts_.at(0);
  const auto later = attempts_.at(3);
  EXPECT_EQ(attempts_,
            (std::vector<SteadyTime>{start, start + 1500ms, start + 3s, later, later, later}));
}

TEST_F(ZLKRetryableNetworkRequestTest, AnyStatusIsAnAnswer) {
  perform({5, 1h, false}, 0s, 2);
  ASSERT_EQ(results_.size(), 1u);
  EXPECT_EQ(results_[0].status(), 500);
  EXPECT_EQ(session_.tasks().size(), 2u);
}

TEST(MonotonicDurationTest, TruncatesToMilliseconds) {
  EXPECT_EQ(mach_duration_to_milliseconds(0), 0u);
  EXPECT_EQ(mach_duration_to_milliseconds(1'500'000), 1u);
  EXPECT_EQ(mach_duration_to_milliseconds(36'000, {125, 3}), 1u);
  EXPECT_EQ(mach_duration_to_milliseconds(36'000, {125, 0}), 0u);
}

}  // namespace
}  // namespace zelkord
