#include <gmock/gmock.h>
#include <sys/stat.h>

#include <thread>

#include "platform/linux/files/LinuxFileManager.h"
#include "platform/linux/queues/LinuxWorkQueues.h"
#include "platform/linux/settings/LinuxSettings.h"
#include "platform/testing/FakeSettings.h"
#include "platform/testing/ForkedProcess.h"
#include "platform/testing/ManualTimeline.h"
#include "platform/testing/RecordingLog.h"
#include "platform/testing/TemporaryDirectory.h"

namespace zelkord {
namespace {

using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;

class LinuxSettingsTest : public testing::Test {
 protected:
  std::unique_ptr<LinuxSettings> make() {
    LinuxSettings::Options options;
    options.databasePath = root_ / "defaults.db";
    options.systemFolders = {root_ / "first", root_ / "second"};
    options.busyTimeout = 1ms;
    return std::make_unique<LinuxSettings>(options, files_, timeline_, log_);
  }
  std::vector<std::string> stored() {
    auto database = sqlite::Database::open(root_ / "defaults.db", nullptr);
    auto rows = database->prepare("SELECT domain || '|' || key || '|' || value FROM defaults");
    std::vector<std::string> texts;
    while (rows.step()) texts.emplace_back(rows.text(0));
    return texts;
  }

  const TemporaryDirectory root_;
  LinuxFileManager files_{{root_.path(), root_.path(), root_.path()}};
  ManualTimeline timeline_;
  RecordingLog log_;
};

TEST_F(LinuxSettingsTest, AUsersValueWinsOverTheSystemsOverARegisteredOne) {
  root_.write("first/defaults.json", R"({"a": "first", "b": 1})");
  root_.write("second/defaults.json", R"({"a": "second", "c": [true]})");
  root_.write("first/com.quenta.lookup.shared.json", R"({"x": {"$date": 5}})");
  root_.write("first/device.json", R"({"locale": "de_DE"})");
  const auto settings = make();
  settings->registerDefaults({{"a", "registered"}, {"d", 2}});
  settings->set("b", "user");

  const std::pair<const char*, json::value> expected[] = {
      {"a", "first"}, {"b", "user"}, {"c", {true}}, {"d", 2}};
  for (const auto& [key, value] : expected) {
    SCOPED_TRACE(key);
    EXPECT_EQ(settings->value(key), value);
    EXPECT_EQ(settings->value(key, "com.quenta.zelkord"), value);
    EXPECT_EQ(settings->value(key, "com.quenta.lookup.shared"), std::nullopt);
  }
  EXPECT_EQ(settings->value("x", "com.quenta.lookup.shared"), (json::value{{"$date", 5}}));
  EXPECT_EQ(settings->all(),
            (json::object{{"a", "first"}, {"b", "user"}, {"c", {true}}, {"d", 2}}));
  EXPECT_THAT(settings->all("device"), IsEmpty());
  settings->remove("b");
  EXPECT_EQ(settings->value("b"), json::value(1));
}

TEST_F(LinuxSettingsTest, KeepsWhatWasSetOverARestart) {
  const json::value values[] = {
      true,      "text \xC3\xBC \n", -5, 1.5, nullptr, {1, "a"}, json::object{{"$date", 1.25}},
      UINT64_MAX};
  {
    const auto settings = make();
    for (std::size_t i = 0; i < std::size(values); ++i) {
      settings->set("k" + std::to_string(i), values[i], "some domain");
    }
    settings->set("gone", 1);
    settings->remove("gone");
    timeline_.runUntilIdle();
  }
  const auto settings = make();
  for (std::size_t i = 0; i < std::size(values); ++i) {
    SCOPED_TRACE(i);
    EXPECT_EQ(settings->value("k" + std::to_string(i), "some domain"), values[i]);
  }
  EXPECT_THAT(settings->all(), IsEmpty());
  struct stat status {};
  ::stat((root_ / "defaults.db").c_str(), &status);
  EXPECT_EQ(status.st_mode & 07777, 0600u);
}

TEST_F(LinuxSettingsTest, ReplacesADamagedDatabase) {
  const std::string noise(20000, 'x');
  for (const auto& damage : {noise, "SQLite format 3" + noise, std::string("short")}) {
    SCOPED_TRACE(damage.substr(0, 20));
    const TemporaryDirectory other;
    log_.clear();
    other.write("defaults.db", damage);
    LinuxSettings::Options options;
    options.databasePath = other / "defaults.db";
    {
      LinuxSettings settings(options, files_, timeline_, log_);
      settings.set("a", 1);
      EXPECT_THAT(log_.texts(), testing::ElementsAre(HasSubstr("is damaged")));
      EXPECT_EQ(other.read("defaults.db.damaged-1"), damage);
    }
    EXPECT_EQ(LinuxSettings(options, files_, timeline_, log_).value("a"), json::value(1));
    EXPECT_THAT(log_.entries(), SizeIs(1));
  }
}

TEST_F(LinuxSettingsTest, SurvivesDamageThatShowsAtAWrite) {
  const auto settings = make();
  settings->set("a", 1);
  settings->flush();
  root_.write("defaults.db", std::string(20000, 'x'));
  settings->set("b", 2);
  settings->flush();
  EXPECT_THAT(stored(), testing::ElementsAre("com.quenta.zelkord|a|1", "com.quenta.zelkord|b|2"));
}

TEST_F(LinuxSettingsTest, IgnoresWhatDoesNotParse) {
  make()->set("good", 1);
  auto database = sqlite::Database::open(root_ / "defaults.db", nullptr);
  database->execute("INSERT INTO defaults VALUES('com.quenta.zelkord', 'bad', '{')");
  root_.write("first/defaults.json", "[1]");
  root_.write("second/defaults.json", "{");
  const auto settings = make();
  EXPECT_EQ(settings->all(), (json::object{{"good", 1}}));
  EXPECT_EQ(log_.count(LogLevel::Error), 3);
}

TEST_F(LinuxSettingsTest, TakesAnotherTableForDamage) {
  auto database = sqlite::Database::open(root_ / "defaults.db", nullptr);
  database->execute("CREATE TABLE defaults(something TEXT)");
  database.reset();
  make()->set("a", 1);
  EXPECT_EQ(make()->value("a"), json::value(1));
  EXPECT_TRUE(root_.has("defaults.db.damaged-1"));
}

TEST_F(LinuxSettingsTest, TakesAViewForDamageAndRunsNoTrigger) {
  auto database = sqlite::Database::open(root_ / "defaults.db", nullptr);
  ASSERT_FALSE(database->execute(
      "CREATE VIEW defaults(domain, key, value) AS WITH RECURSIVE n(i) AS "
      "(SELECT 1 UNION ALL SELECT i + 1 FROM n) SELECT 'd', 'k' || i, '1' FROM n"));
  make()->set("a", 1);
  EXPECT_TRUE(root_.has("defaults.db.damaged-1"));
  database = sqlite::Database::open(root_ / "defaults.db", nullptr);
  ASSERT_FALSE(database->execute(
      "CREATE TRIGGER t AFTER INSERT ON defaults BEGIN DELETE FROM defaults; END"));
  make()->set("b", 2);
  EXPECT_EQ(make()->all(), (json::object{{"a", 1}, {"b", 2}}));
}

TEST_F(LinuxSettingsTest, KeepsInMemoryWhatALockKeepsOut) {
  const auto settings = make();
  auto database = sqlite::Database::open(root_ / "defaults.db", nullptr);
  ASSERT_FALSE(database->execute("BEGIN EXCLUSIVE"));
  settings->set("a", 1);
  settings->flush();
  settings->set("b", 2);
  settings->flush();
  EXPECT_EQ(settings->value("a"), json::value(1));
  EXPECT_EQ(log_.count("somebody else holds"), 1);

  ASSERT_FALSE(database->execute("ROLLBACK"));
  settings->flush();
  EXPECT_THAT(stored(), SizeIs(2));
}

TEST_F(LinuxSettingsTest, WorksWhereNothingCanBeWritten) {
  make()->set("a", 1);
  ::chmod(root_.path().c_str(), 0755);
  ::chmod((root_ / "defaults.db").c_str(), 0644);
  EXPECT_TRUE(succeedsInChild([&] {
    if (!dropPrivileges()) return false;
    const auto settings = make();
    settings->set("b", 2);
    settings->flush();
    settings->flush();
    return settings->value("a") == json::value(1) && settings->value("b") == json::value(2) &&
           log_.count(LogLevel::Error) == 1;
  }));
}

TEST_F(LinuxSettingsTest, ManyThreadsReadAndWrite) {
  constexpr int kWrites = 200;
  LinuxSettings::Options options;
  options.databasePath = root_ / "threads.db";
  const LinuxClock clock;
  LinuxWorkQueues queues(clock, 2);
  {
    LinuxSettings settings(options, files_, queues, log_);
    std::vector<std::thread> threads;
    for (const char* key : {"a", "b", "c"}) {
      threads.emplace_back([&settings, key] {
        for (int i = 1; i <= kWrites; ++i) {
          settings.set(key, i);
          EXPECT_EQ(settings.value(key), json::value(i));
          if (i % 50 == 0) settings.flush();
        }
      });
    }
    for (auto& thread : threads) thread.join();
  }
  EXPECT_EQ(LinuxSettings(options, files_, queues, log_).all(),
            (json::object{{"a", kWrites}, {"b", kWrites}, {"c", kWrites}}));
}

TEST_F(LinuxSettingsTest, TellsEachWriteOfAKeyToItsObserversOnceTheValueCounts) {
  FakeSettings fake;
  const auto real = make();
  for (SettingsStore* settings :
       {static_cast<SettingsStore*>(&fake), static_cast<SettingsStore*>(real.get())}) {
    std::vector<json::value> seen;
    auto observer = settings->observe(
        "a", [&] { seen.push_back(settings->value("a").value_or(nullptr)); }, kSettingsDomain);
    settings->set("a", 1);
    settings->set("b", 2);
    settings->set("a", 3, "other");
    settings->set("a", 4, kSettingsDomain);
    settings->remove("a");
    observer.reset();
    settings->set("a", 5);
    EXPECT_EQ(seen, (std::vector<json::value>{1, 4, nullptr}));
  }
}

TEST(FakeSettingsTest, LayersLikeTheRealOne) {
  FakeSettings settings;
  settings.registerDefaults({{"a", 1}});
  EXPECT_EQ(settings.value("a", kSettingsDomain), json::value(1));
  EXPECT_EQ(settings.value("a", "other"), std::nullopt);
  settings.set("a", 2, kSettingsDomain);
  EXPECT_EQ(settings.value("a"), json::value(2));
  settings.remove("a");
  EXPECT_EQ(settings.all(), (json::object{{"a", 1}}));
}

}  // namespace
}  // namespace zelkord
