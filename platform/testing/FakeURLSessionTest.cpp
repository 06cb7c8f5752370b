#include <gtest/gtest.h>

#include "platform/testing/FakeURLSession.h"
#include "platform/testing/FakeURLSessions.h"
#include "platform/testing/ManualTimeline.h"

namespace zelkord {
namespace {

class FakeURLSessionTest : public ::testing::Test {
 protected:
  std::shared_ptr<URLTask> start(const std::string& url) {
    const auto task = session_->dataTask(
        {.url = url}, [this](const auto&, const auto& result) { results_.push_back(result); });
    task->resume();
    return task;
  }

  ManualTimeline timeline_;
  FakeURLSessions sessions_{timeline_};
  std::shared_ptr<URLSession> session_ = sessions_.make({.name = "test"});
  std::shared_ptr<FakeURLSession> fake_ = sessions_.find("test");
  std::vector<URLResult> results_;
};

TEST_F(FakeURLSessionTest, DeliversAnswersOnTheTimeline) {
  start("https://a.example/");
  start("https://b.example/");
  fake_->pending().at(1)->succeed(200, "b");
  fake_->pending().at(0)->fail(urlError(URLErrorCode::ConnectionLost));
  EXPECT_TRUE(results_.empty());
  timeline_.runUntilIdle();
  ASSERT_EQ(results_.size(), 2u);
  EXPECT_EQ(results_[0].data->view(), "b");
  EXPECT_EQ(results_[0].response->url, "https://b.example/");
  EXPECT_EQ(results_[1].error->code, -1005);
  EXPECT_TRUE(fake_->pending().empty());
}

TEST_F(FakeURLSessionTest, DropsTheAnswerToACancelledTask) {
  const auto task = start("https://a.example/");
  task->cancel();
  fake_->tasks().at(0)->succeed();
  timeline_.runUntilIdle();
  ASSERT_EQ(results_.size(), 1u);
  EXPECT_EQ(results_[0].error->code, -999);
}

TEST_F(FakeURLSessionTest, AnswersByItself) {
  fake_->setOnResume([](FakeURLTask& task) { task.succeed(204); });
  start("https://a.example/");
  timeline_.runUntilIdle();
  EXPECT_EQ(results_.at(0).status(), 204);
}

}  // namespace
}  // namespace zelkord
