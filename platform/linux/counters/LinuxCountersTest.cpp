#include <gmock/gmock.h>

#include "platform/linux/counters/LinuxCounters.h"
#include "platform/linux/counters/OpenMetrics.h"
#include "platform/linux/files/LinuxFileManager.h"
#include "platform/linux/notifications/BusNotifications.h"
#include "platform/testing/FakeFileManager.h"
#include "platform/testing/ManualTimeline.h"
#include "platform/testing/RecordingLog.h"
#include "platform/testing/TemporaryDirectory.h"

namespace zelkord {
namespace {

using testing::HasSubstr;

TEST(OpenMetricsTest, EscapesKeysAndEndsTheText) {
  EXPECT_EQ(openMetricsText({{"com.quenta.zelkord.search", 12}, {"a\"b\\c\nd", -1}}),
            "# TYPE zelkord_counter gauge\n"
            "# HELP zelkord_counter Counters of zelkord, cumulative over restarts.\n"
            "zelkord_counter{key=\"a\\\"b\\\\c\\nd\"} -1\n"
            "zelkord_counter{key=\"com.quenta.zelkord.search\"} 12\n"
            "# EOF\n");
  EXPECT_THAT(openMetricsText({}), testing::EndsWith("# EOF\n"));
}

class LinuxCountersTest : public testing::Test {
 protected:
  std::unique_ptr<LinuxCounters> make() {
    return std::make_unique<LinuxCounters>(files_, timeline_, log_);
  }

  const TemporaryDirectory root_;
  LinuxFileManager files_{{root_.path(), root_.path(), root_ / "run"}};
  ManualTimeline timeline_;
  RecordingLog log_;
};

TEST_F(LinuxCountersTest, AreWrittenTogether15SecondsAfterTheFirstChange) {
  const auto counters = make();
  timeline_.advance(1h);
  EXPECT_FALSE(root_.has("run/metrics.prom"));
  counters->add("a", 1);
  timeline_.advance(14s);
  counters->add("a", 2);
  EXPECT_FALSE(root_.has("run/metrics.prom"));
  timeline_.advance(1s);
  EXPECT_THAT(root_.read("run/metrics.prom"), HasSubstr("{key=\"a\"} 3\n"));
  EXPECT_EQ(CounterDatabase(root_ / "counters.db", Logger(log_, "")).load().values(),
            (BoundedCounters::Values{{"a", 3}}));
  EXPECT_EQ(timeline_.nextDelay(), std::nullopt);
}

TEST_F(LinuxCountersTest, GoOnAfterARestart) {
  {
    const auto counters = make();
    counters->add("added", 5);
    counters->set("set", INT64_MIN);
    counters->set("zero", 0);
  }
  const auto counters = make();
  counters->add("added", INT64_MAX);
  EXPECT_EQ(counters->all(), (std::map<std::string, std::int64_t>{
                                 {"added", INT64_MAX}, {"set", INT64_MIN}, {"zero", 0}}));
}

TEST_F(LinuxCountersTest, AFloodOfKeysCountsUnderOneForAllOthers) {
  const auto key = [](int i) {
    return "com.quenta.zelkord.limit.agent " + std::to_string(i) + ".sessions";
  };
  const auto counters = make();
  counters->add("mine", 1);
  for (int i = 0; i < 10'000; ++i) counters->add(key(i), 2);
  for (int i = 0; i < 1000; ++i) counters->add(key(i) + std::string(64 * 1024, 'x'), 3);
  counters->add(std::string(256, 'y'), 5);
  counters->set("late", 7);
  counters->set("mine", 9);
  const auto all = counters->all();
  EXPECT_EQ(all.size(), 3840u);
  EXPECT_EQ(all.at("mine"), 9);
  EXPECT_EQ(all.at(key(3837)), 2);
  EXPECT_EQ(all.at("com.quenta.zelkord.other"), (10'000 - 3838) * 2 + 1000 * 3 + 5 + 7);
  counters->save();
  EXPECT_EQ(make()->all(), all);
}

TEST_F(LinuxCountersTest, KeysOfClientsLeaveRoomForTheDaemonsOwn) {
  const auto counters = make();
  for (int i = 0; i < 5'000; ++i) {
    counters->add("com.quenta.zelkord.agent " + std::to_string(i) + ".sessions", 1);
  }
  for (int i = 0; i < 300; ++i) {
    counters->add("com.quenta.zelkord.limit.budget_" + std::to_string(i), 1);
  }
  const auto all = counters->all();
  EXPECT_EQ(all.size(), 4096u);
  EXPECT_EQ(all.at("com.quenta.zelkord.limit.budget_255"), 1);
  EXPECT_EQ(all.at("com.quenta.zelkord.other"), 5'000 - 3839 + 300 - 256);
}

TEST_F(LinuxCountersTest, AStoreOfAnEarlierVersionIsCutDown) {
  const auto path = root_ / "counters.db";
  make()->add("com.quenta.zelkord.other", 1);
  auto database = sqlite::Database::open(path, nullptr);
  ASSERT_TRUE(database);
  ASSERT_FALSE(database->execute(
      "WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < 12000)"
      "INSERT INTO counters SELECT i || iif(i % 2, printf('%500c', 'x'), ''), 1 FROM n"));
  EXPECT_GT(root_.read("counters.db").size(), 3'000'000u);
  database.reset();
  const auto all = make()->all();
  EXPECT_EQ(all.size(), 3840u);
  EXPECT_EQ(all.at("com.quenta.zelkord.other"), 12'000 + 1 - 3839);
  EXPECT_LT(root_.read("counters.db").size(), 500'000u);
  EXPECT_EQ(log_.count("cut down to 3840"), 1);
  EXPECT_EQ(make()->all(), all);
  EXPECT_EQ(log_.count("cut down"), 1);
}

TEST_F(LinuxCountersTest, BeginAnewAfterDamage) {
  root_.write("counters.db", std::string(10000, 'x'));
  make()->add("a", 1);
  EXPECT_EQ(make()->all(), (std::map<std::string, std::int64_t>{{"a", 1}}));
  EXPECT_EQ(log_.count(LogLevel::Error), 1);
  EXPECT_TRUE(root_.has("counters.db.damaged-1"));
}

TEST_F(LinuxCountersTest, AreTriedAgainAndComplainOnceWhenTheDiskIsFull) {
  FakeFileManager files({root_.path(), root_.path(), "/runtime"});
  LinuxCounters counters(files, timeline_, log_);
  files.fail(FakeFileManager::Operation::Write, ENOSPC);
  counters.add("a", 1);
  timeline_.advance(60s);
  EXPECT_EQ(log_.count(LogLevel::Error), 1);
  files.fail(FakeFileManager::Operation::Write, 0);
  timeline_.advance(15s);
  EXPECT_THAT(files.bytes("/runtime/metrics.prom"), testing::Optional(HasSubstr("} 1\n")));
}

TEST(BusNotificationsTest, ASignalCarriesTheName) {
  RecordingLog log;
  std::vector<std::string> sent;
  bool hasBus = true;
  BusNotifications notifications(
      [&](const BusSignal& signal) {
        sent.push_back(signal.path + " " + signal.interface + "." + signal.member + " " +
                       signal.argument);
        return hasBus;
      },
      log);
  notifications.post("com.quenta.zelkord.news.enabled");
  EXPECT_THAT(sent, testing::ElementsAre("/com/quenta/zelkord com.quenta.zelkord.Notification1."
                                         "Posted com.quenta.zelkord.news.enabled"));
  hasBus = false;
  notifications.post("a");
  notifications.post("b");
  EXPECT_EQ(log.entries().size(), 1u);
}

}  // namespace
}  // namespace zelkord
