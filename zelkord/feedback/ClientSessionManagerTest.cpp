#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "zelkord/assembly/NotificationNames.h"
#include "zelkord/feedback/ClientSessionManager.h"
#include "zelkord/feedback/FeedbackSeams.h"
#include "zelkord/feedback/SessionsTestSupport.h"

namespace zelkord {
namespace {

using testing::ElementsAre;

class ClientSessionManagerTest : public testing::Test {
 protected:
  void use(bool shared) {
    bed_ = std::make_unique<SessionsBed>(shared);
    manager_ =
        std::make_shared<ClientSessionManager>(bed_->assembly, bed_->guids, "zelkor", bed_->room);
    soft_ = max_ = 0;
    const auto count = [&](std::string_view name, int& number) {
      return bed_->fakes.notificationCenter.observe(std::string(name),
                                                    [&number](const auto&) { ++number; });
    };
    softObserver_ = count(kZLKSessionSoftLimitNotification, soft_);
    maxObserver_ = count(kZLKSessionMaxLimitNotification, max_);
  }
  ClientSessionManagerTest() { use(true); }

  template <typename T = HVStartSearchFeedback>
  void add(std::optional<std::string> agent = "Lanthe/9") {
    manager_->addZelkorFeedback(SessionsBed::record<T>(std::move(agent)));
    bed_->fakes.timeline.runUntilIdle();
  }
  void advance(Duration time) { bed_->fakes.timeline.advance(time); }
  // Records often enough never to be idle.
  void use(Duration time) {
    for (; time > 0s; time -= 60s) {
      advance(std::min<Duration>(time, 60s));
      add();
    }
  }
  const RecordingContainer& container(std::size_t index) {
    return *bed_->storage->containers.at(index);
  }
  std::size_t containers() { return bed_->storage->containers.size(); }
  bool logged(std::string_view text) { return bed_->fakes.log.contains(text); }

  std::unique_ptr<SessionsBed> bed_;
  std::shared_ptr<ClientSessionManager> manager_;
  int soft_ = 0;
  int max_ = 0;
  Subscription softObserver_;
  Subscription maxObserver_;
};

TEST_F(ClientSessionManagerTest, TheFirstRecordOpensASessionThatHasNoPredecessor) {
  for (const bool shared : {true, false}) {
    SCOPED_TRACE(shared);
    use(shared);
    EXPECT_TRUE(logged(shared ? "Zelkor is using shared session for all clients zelkor"
                              : "Zelkor is using individual session for clients zelkor"));
    EXPECT_EQ(manager_->session(), nullptr);
    add();
    ASSERT_EQ(containers(), 1u);
    EXPECT_EQ(container(0).headers, 1);
    EXPECT_EQ(container(0).header.agent, "Lanthe/9");
    EXPECT_EQ(container(0).previousEndReason(), "no previous session");
    EXPECT_THAT(container(0).classes(), ElementsAre("HVStartSearchFeedback"));
    EXPECT_EQ(container(0).records[0].userGuid, bed_->guids->currentUserGUID());
    EXPECT_EQ(container(0).records[0].feedback->timestamp, 1'000'000'000'000u);
    EXPECT_EQ(manager_->currentState(), SessionState::Active);
    EXPECT_TRUE(logged("new session id 1 zelkor"));
    EXPECT_EQ(manager_->expirationTime(), bed_->fakes.timeline.now() + 180s);
    EXPECT_TRUE(bed_->fakes.transactions.openNames().empty());
  }
}

TEST_F(ClientSessionManagerTest, KeepsATimestampThatTheClientGave) {
  auto feedback = std::make_shared<HVStartSearchFeedback>();
  feedback->timestamp = 5;
  manager_->addZelkorFeedback(SessionsBed::record(feedback));
  EXPECT_THAT(bed_->fakes.transactions.openNames(), ElementsAre("addFeedback"));
  bed_->fakes.timeline.runUntilIdle();
  EXPECT_EQ(container(0).records[0].feedback->timestamp, 5u);
}

TEST_F(ClientSessionManagerTest, AnotherUserIdentifierEndsTheSessionInWhicheverState) {
  for (const auto& [time, state] :
       {std::pair{0s, SessionState::Active}, {660s, SessionState::SoftLimitReached}}) {
    use(true);
    add();
    use(Duration(time));
    EXPECT_EQ(manager_->currentState(), state);
    const auto old = bed_->guids->currentUserGUID();
    bed_->guids->reset();
    add<HVEndSearchFeedback>();
    ASSERT_EQ(containers(), 2u);
    EXPECT_EQ(container(0).endReason(), "guid changed");
    EXPECT_EQ(container(0).records.back().userGuid, old);
    EXPECT_EQ(container(0).records.back().userAgent, "Lanthe/9");
    EXPECT_TRUE(container(0).isClosed);
    EXPECT_THAT(container(1).classes(), ElementsAre("HVEndSearchFeedback"));
    EXPECT_EQ(container(1).previousEndReason(), "guid changed");
    EXPECT_EQ(manager_->currentState(), SessionState::Active);
    EXPECT_TRUE(logged("session flushed because guid changed zelkor"));
  }
}

TEST_F(ClientSessionManagerTest, WhatWaitsIsBoundedInAllAndOfAProcess) {
  const auto put = [&](std::int64_t pid, std::size_t bytes) {
    auto custom = std::make_shared<HVCustomFeedback>();
    custom->jsonFeedback = std::string(bytes, 'x');
    auto record = SessionsBed::record(std::move(custom));
    record.pid = pid;
    return manager_->addZelkorFeedback(std::move(record));
  };
  constexpr std::size_t kMiB = 1024 * 1024;
  // A record counts for four times its message and a little more.
  for (int i = 0; i < 7; ++i) EXPECT_TRUE(put(7, kMiB / 4));
  EXPECT_FALSE(put(7, kMiB / 4));
  int small = 0;
  while (put(7, 0)) ++small;
  EXPECT_LT(small, 1024);
  for (const std::int64_t pid : {8, 0, 9}) {
    for (int i = 0; i < 7; ++i) EXPECT_TRUE(put(pid, kMiB / 4)) << pid;
  }
  EXPECT_TRUE(put(10, kMiB / 8));
  EXPECT_FALSE(put(11, kMiB)) << "all of it is held";
  EXPECT_LE(bed_->room->waiting().held(), 32 * kMiB);
  EXPECT_EQ(bed_->counter("com.quenta.zelkord.limit.feedback_waiting"), 3);
  EXPECT_EQ(bed_->fakes.log.count("limit feedback_waiting reached by pid 7"), 1);

  bed_->fakes.timeline.runUntilIdle();
  EXPECT_EQ(bed_->room->waiting().held(), 0u);
  EXPECT_TRUE(put(7, kMiB / 2));
  bed_->fakes.timeline.runUntilIdle();
}

// A client with its own session, used from morning to evening.
TEST_F(ClientSessionManagerTest, IndividualSessionsFollowADayOfUse) {
  use(false);
  const auto startOfDay = bed_->fakes.timeline.now();
  const auto until = [&](Duration timeOfDay) {
    advance(startOfDay + timeOfDay - bed_->fakes.timeline.now());
  };
  const auto goOn = [&](Duration time) {
    advance(time);
    add();
  };
  // A look in the morning, until the client goes.
  add();
  add<HVResultEngagementFeedback>();
  bool flushed = false;
  manager_->flushSessionInvalidation("Lanthe/9", 7, [&](bool did) { flushed = did; });
  bed_->fakes.timeline.runUntilIdle();
  EXPECT_TRUE(flushed);
  // A quarter of an hour of typing and no engagement.
  until(1h);
  use(900s);
  add();
  // A pause after the soft limit.
  until(2h);
  add();
  goOn(590s);
  goOn(210s);
  // What has passed its soft limit ends with an engagement.
  until(3h);
  use(660s);
  add<HVCardSectionEngagementFeedback>();
  // Another user identifier, in the middle of a session.
  until(5h);
  add();
  bed_->guids->reset();
  add();
  // In the evening the daemon is asked to end it.
  until(10h);
  add();
  manager_->flushSession(nullptr);
  bed_->fakes.timeline.runUntilIdle();

  std::string day;
  for (const auto& each : bed_->storage->containers) {
    EXPECT_TRUE(each->isClosed);
    EXPECT_EQ(each->headers, 1);
    EXPECT_EQ(each->header.agent, "Lanthe/9");
    day += fmt::format("{} after {}: {}\n", each->endReason().value_or("none"),
                       each->previousEndReason(), each->records.size());
  }
  EXPECT_EQ(day,
            "external request after no previous session: 3\n"
            "max session time passed after external request: 17\n"
            "session idle after max session time passed: 3\n"
            "max session time passed after session idle: 2\n"
            "engagement received after max session time passed: 13\n"
            "guid changed after engagement received: 2\n"
            "max session time passed after guid changed: 2\n"
            "external request after max session time passed: 2\n");
  EXPECT_EQ(soft_, 5);
  EXPECT_EQ(max_, 4);
  EXPECT_EQ(bed_->guids->resets, 3);
  EXPECT_EQ(manager_->currentState(), SessionState::NoSession);
}

TEST_F(ClientSessionManagerTest, AClosingEngagementBelongsToTheSessionThatItEnds) {
  add();
  add<HVResultEngagementFeedback>();  // too early to close anything
  EXPECT_EQ(containers(), 1u);
  use(600s);
  EXPECT_EQ(manager_->currentState(), SessionState::SoftLimitReached);
  add<HVCardSectionEngagementFeedback>();
  const auto classes = container(0).classes();
  EXPECT_EQ(classes[classes.size() - 2], "HVCardSectionEngagementFeedback");
  EXPECT_EQ(container(0).endReason(), "engagement received");
  EXPECT_TRUE(container(0).isClosed);
  EXPECT_EQ(manager_->session(), nullptr);
  EXPECT_EQ(bed_->guids->resets, 1);
  EXPECT_TRUE(logged("session flushed because soft limit reached and sentinel feedback received"));
  add();
  EXPECT_EQ(container(1).previousEndReason(), "engagement received");
  EXPECT_EQ(container(1).header.userGuidString, bed_->guids->currentUserGUID().string());
}

TEST_F(ClientSessionManagerTest, IdlenessCountsOnlyAfterTheSoftLimit) {
  add();
  advance(590s);
  add();  // idle for long, but within the soft limit
  EXPECT_EQ(containers(), 1u);
  advance(179s);
  add();
  EXPECT_EQ(containers(), 1u);
  bed_->fakes.timeline.setWall(bed_->fakes.timeline.wallNow() + 24h * 365);
  add();  // a jump of the clock is no idleness
  EXPECT_EQ(containers(), 1u);
}

TEST_F(ClientSessionManagerTest, ARecordAfterThreeIdleMinutesOpensTheNextSession) {
  add();
  use(600s);
  advance(180s);
  const auto old = bed_->guids->currentUserGUID();
  add<HVEndSearchFeedback>();
  EXPECT_EQ(container(0).endReason(), "session idle");
  EXPECT_EQ(container(0).records.back().userGuid, old);
  EXPECT_THAT(container(1).classes(), ElementsAre("HVEndSearchFeedback"));
  EXPECT_NE(container(1).records[0].userGuid, old);
  EXPECT_EQ(container(1).previousEndReason(), "session idle");
  EXPECT_EQ(bed_->guids->resets, 1);
  EXPECT_TRUE(
      logged("session flushed because soft limit reached and idle time was beyond 180 zelkor"));
}

TEST_F(ClientSessionManagerTest, LastsFifteenMinutesAtMost) {
  add();
  use(600s);
  EXPECT_EQ(soft_, 1);
  EXPECT_TRUE(logged("soft limit reached expected 1 current 1 zelkor"));
  EXPECT_TRUE(logged("soft limit reached, maxtimer session id 1 zelkor"));
  use(240s);
  EXPECT_EQ(max_, 0);
  advance(60s);
  EXPECT_EQ(max_, 1);
  EXPECT_EQ(container(0).endReason(), "max session time passed");
  EXPECT_EQ(manager_->currentState(), SessionState::NoSession);
  EXPECT_TRUE(logged("max timer expired expected 1 current 1"));
  EXPECT_TRUE(logged("session flushed because max timer expired zelkor"));
  EXPECT_EQ(bed_->fakes.timeline.nextDelay(), std::nullopt);
}

// The timers of older sessions: the soft limit's does nothing, the maximum's is announced.
TEST_F(ClientSessionManagerTest, TimersKnowTheirSession) {
  add();
  advance(300s);
  manager_->flushSession(nullptr);
  add();
  advance(300s);  // the first session's soft limit
  EXPECT_TRUE(logged("soft limit reached expected 1 current 2 zelkor"));
  EXPECT_EQ(soft_, 0);
  EXPECT_EQ(manager_->currentState(), SessionState::Active);
  advance(300s);  // the second's
  EXPECT_EQ(soft_, 1);
  add<HVResultEngagementFeedback>();  // ends the second
  add();
  advance(300s);  // its max timer, while the third is open
  EXPECT_TRUE(logged("max timer expired expected 2 current 3"));
  EXPECT_EQ(max_, 1);
  EXPECT_EQ(manager_->currentState(), SessionState::Active);
}

TEST_F(ClientSessionManagerTest, AMaxTimerWithoutASessionStaysSilent) {
  add();
  use(600s);
  manager_->flushSession(nullptr);
  advance(300s);
  EXPECT_TRUE(logged("max timer expired expected 1 current 1"));
  EXPECT_EQ(max_, 0);
  EXPECT_EQ(containers(), 1u);
}

TEST_F(ClientSessionManagerTest, AManagerThatIsGoneHasNoTimers) {
  add();
  manager_.reset();
  advance(2h);
  EXPECT_EQ(soft_ + max_, 0);
}

TEST_F(ClientSessionManagerTest, AFlushCallsBackWhetherThereIsASessionOrNot) {
  int called = 0;
  manager_->flushSession([&] { ++called; });
  bed_->fakes.timeline.runUntilIdle();
  EXPECT_EQ(called, 1);
  add();
  add<HVStartSearchFeedback>("Brelin/1");
  manager_->flushSession([&] { ++called; });
  manager_->addZelkorFeedback(SessionsBed::record<HVEndSearchFeedback>());  // belongs to the next
  bed_->fakes.timeline.runUntilIdle();
  EXPECT_EQ(called, 2);
  ASSERT_EQ(containers(), 3u);
  for (const std::size_t index : {0, 1}) {
    EXPECT_EQ(container(index).endReason(), "external request");
    EXPECT_TRUE(container(index).isClosed);
  }
  EXPECT_THAT(container(2).classes(), ElementsAre("HVEndSearchFeedback"));
}

TEST_F(ClientSessionManagerTest, TheEndOfAConnectionFlushesOnlyASessionOfItsOwn) {
  for (const bool shared : {true, false}) {
    SCOPED_TRACE(shared);
    use(shared);
    add();
    std::optional<bool> flushed;
    manager_->flushSessionInvalidation("Lanthe/9", 7, [&](bool did) { flushed = did; });
    EXPECT_EQ(flushed.has_value(), shared);  // told at once
    bed_->fakes.timeline.runUntilIdle();
    EXPECT_EQ(flushed, !shared);
    EXPECT_THAT(container(0).classes(),
                ElementsAre("HVStartSearchFeedback",
                            shared ? "ZelkorConnectionInvalidated" : "ZelkorSessionEndFeedback"));
    EXPECT_EQ(container(0).isClosed, !shared);
  }
}

TEST_F(ClientSessionManagerTest, DropsWhatTheServiceDoesNotWant) {
  struct Gate final : FeedbackGate {
    bool dropsFeedback(const std::optional<std::string>& agent) override {
      return agent == "Brelin/1";
    }
  };
  bed_->assembly.feedbackGate.set(std::make_shared<Gate>());
  add<HVStartSearchFeedback>("Brelin/1");
  EXPECT_EQ(containers(), 0u);
  EXPECT_EQ(manager_->currentState(), SessionState::NoSession);
  add();
  EXPECT_EQ(containers(), 1u);
}

TEST_F(ClientSessionManagerTest, WaitsUntilEverythingIsHandedOver) {
  for (int i = 0; i < 100; ++i) manager_->addZelkorFeedback(SessionsBed::record<HVErrorFeedback>());
  manager_->waitForPendingFeedback();
  EXPECT_EQ(container(0).records.size(), 100u);
}

}  // namespace
}  // namespace zelkord
