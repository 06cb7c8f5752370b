#include <gtest/gtest.h>

#include <memory>
#include <vector>

#include "platform/testing/FakePlatform.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/assembly/NotificationNames.h"
#include "zelkord/network/context/ZelkorUserGUIDController.h"

namespace zelkord {
namespace {

class ZelkorUserGUIDControllerTest : public testing::Test {
 protected:
  std::int64_t counted() const { return platform_.counters.value("com.quenta.zelkord.userguid"); }

  FakePlatform platform_;
  Assembly assembly_{platform_.platform()};
  ZelkorUserGUIDController controller_{assembly_};
  int notified_ = 0;
  Subscription observer_ = platform_.notificationCenter.observe(
      std::string(kZLKUserGUIDChangeNotification), [this](const Notification&) { ++notified_; });
};

TEST_F(ZelkorUserGUIDControllerTest, ReplacesTheIdentifierAtItsFirstUseAfter900Seconds) {
  const auto first = controller_.currentUserGUID();
  platform_.timeline.advance(899s);
  EXPECT_EQ(controller_.currentUserGUID(), first);
  platform_.timeline.runUntilIdle();
  EXPECT_EQ(notified_, 0);
  EXPECT_EQ(counted(), 0);

  platform_.timeline.advance(1s);
  const auto second = controller_.currentUserGUID();
  EXPECT_NE(second, first);
  platform_.timeline.advance(899s);
  EXPECT_EQ(controller_.currentUserGUID(), second);
  EXPECT_EQ(notified_, 1);
  EXPECT_EQ(counted(), 1);
  platform_.timeline.advance(10h);
  EXPECT_EQ(notified_, 1);  // an old one that nobody uses stays
}

TEST_F(ZelkorUserGUIDControllerTest, EndsOldIdentifiersWithTheSessionsThatThereAre) {
  controller_.reset();
  platform_.timeline.runUntilIdle();  // no session yet
  const auto second = controller_.currentUserGUID().string();
  assembly_.urlSession();
  assembly_.bagSession();
  controller_.reset();
  const auto third = controller_.currentUserGUID().string();
  platform_.timeline.advance(900s);
  auto other = std::make_unique<ZelkorUserGUIDController>(assembly_);
  const auto ofOther = other->currentUserGUID().string();
  other.reset();
  controller_.currentUserGUID();
  platform_.timeline.runUntilIdle();
  for (const char* name : {"urlSession", "bagSession"}) {
    const auto session = platform_.urlSessions.find(name);
    EXPECT_EQ(session->endedIdentities(), (std::vector{second, ofOther, third})) << name;
    EXPECT_EQ(session->configuration().identityHeader, "X-Quenta-UserGuid");
  }
}

TEST_F(ZelkorUserGUIDControllerTest, TheWallClockMayJump) {
  const auto first = controller_.currentUserGUID();
  for (const auto jump : {-24h, 48h}) {
    platform_.timeline.setWall(platform_.timeline.wallNow() + jump);
    EXPECT_EQ(controller_.currentUserGUID(), first);
  }
  platform_.timeline.setWall(platform_.timeline.wallNow() - 24h);
  platform_.timeline.advance(900s);
  EXPECT_NE(controller_.currentUserGUID(), first);
}

TEST_F(ZelkorUserGUIDControllerTest, ResetReplacesItAndBeginsANewLife) {
  const auto first = controller_.currentUserGUID();
  platform_.timeline.advance(500s);
  controller_.reset();
  const auto second = controller_.currentUserGUID();
  EXPECT_NE(second, first);
  platform_.timeline.advance(899s);
  EXPECT_EQ(controller_.currentUserGUID(), second);
  EXPECT_EQ(notified_, 1);
}

}  // namespace
}  // namespace zelkord
