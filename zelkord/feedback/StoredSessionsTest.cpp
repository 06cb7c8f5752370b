#include <gtest/gtest.h>

#include "zelkord/feedback/SessionsTestSupport.h"
#include "zelkord/feedback/StoredSessions.h"

namespace zelkord {
namespace {

class StoredSessionsTest : public testing::Test {
 protected:
  // Makes and completes so many sessions of one record; how many were made.
  int make(std::int64_t pid, int count, std::size_t bytes = 0) {
    int made = 0;
    for (int i = 0; i < count; ++i) {
      auto custom = std::make_shared<HVCustomFeedback>();
      custom->jsonFeedback = std::string(bytes, 'x');
      auto record = SessionsBed::record(std::move(custom));
      record.pid = pid;
      const auto session = sessions_.makeSession(std::move(record));
      if (session) session->sessionComplete();
      made += session != nullptr;
    }
    return made;
  }

  SessionsBed bed_;
  StoredSessions sessions_{bed_.assembly};
};

TEST_F(StoredSessionsTest, OnlySoManySessionsForOneOccasionBeginInAMinute) {
  constexpr const char* kCounter = "com.quenta.zelkord.limit.feedback_sessions";
  EXPECT_EQ(make(7, 11'700), 128);
  EXPECT_EQ(bed_.counter(kCounter), 11'700 - 128);
  EXPECT_EQ(make(0, 200), 128);  // the daemon's own, while every keystroke fails
  EXPECT_EQ(make(8, 200), 128);
  EXPECT_EQ(make(9, 200), 128);
  EXPECT_EQ(make(10, 1), 0);
  EXPECT_EQ(bed_.storage->containers.size(), 512u);
  bed_.fakes.timeline.advance(59s);
  EXPECT_EQ(make(7, 1), 0);
  bed_.fakes.timeline.advance(1s);
  EXPECT_EQ(make(7, 200), 128);
  EXPECT_EQ(bed_.fakes.log.count("limit feedback_sessions reached by pid 7"), 2);
}

TEST_F(StoredSessionsTest, ARecordThatIsTooLargeToWaitMakesNoSession) {
  EXPECT_EQ(make(7, 200, 2 * 1024 * 1024), 0);
  EXPECT_EQ(bed_.counter("com.quenta.zelkord.limit.feedback_waiting"), 200);
  EXPECT_TRUE(bed_.storage->containers.empty());
  EXPECT_EQ(make(7, 128), 128) << "it takes no session's place either";
}

}  // namespace
}  // namespace zelkord
