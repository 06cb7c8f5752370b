#include <gmock/gmock.h>
#include <sqlite3.h>
#include <sys/resource.h>
#include <sys/stat.h>

#include <csignal>
#include <functional>

#include "platform/linux/files/LinuxFileManager.h"
#include "platform/linux/knowledge/LinuxKnowledgeStore.h"
#include "platform/testing/ForkedProcess.h"
#include "platform/testing/ManualTimeline.h"
#include "platform/testing/RecordingLog.h"
#include "platform/testing/TemporaryDirectory.h"

namespace zelkord {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;

constexpr const char* kStoreFile = "com.quenta.knowledge/knowledge.db";

// All rows, as another program sees them; columns are joined by "|".
std::vector<std::string> rowsOf(const std::string& path, const char* sql) {
  std::vector<std::string> rows;
  sqlite3* database = nullptr;
  sqlite3_open_v2(path.c_str(), &database, SQLITE_OPEN_READWRITE, nullptr);
  sqlite3_exec(
      database, sql,
      [](void* out, int count, char** values, char**) {
        std::string row;
        for (int i = 0; i < count; ++i) row += (i ? "|" : "") + std::string(values[i]);
        static_cast<std::vector<std::string>*>(out)->push_back(row);
        return 0;
      },
      &rows, nullptr);
  sqlite3_close(database);
  return rows;
}

class LinuxKnowledgeStoreTest : public testing::Test {
 protected:
  std::unique_ptr<LinuxKnowledgeStore> make(const std::string& dataHome) {
    return std::make_unique<LinuxKnowledgeStore>(dataHome, files_, timeline_, timeline_, log_);
  }
  DonatedInteraction interaction(std::string parameters = "{}", std::string domain = "Brelin") {
    return {std::move(domain), "Engagement", std::move(parameters), timeline_.wallNow()};
  }
  std::vector<std::string> rows(const char* sql = "SELECT parameters FROM interaction") {
    return rowsOf(data_ / kStoreFile, sql);
  }

  const TemporaryDirectory data_;
  LinuxFileManager files_{{data_.path(), data_.path(), data_.path()}};
  ManualTimeline timeline_;
  RecordingLog log_;
  std::unique_ptr<LinuxKnowledgeStore> store_ = make(data_.path());
};

TEST_F(LinuxKnowledgeStoreTest, MakesTheFileWithItsTwoTablesAtTheFirstDonation) {
  timeline_.advance(1h);
  EXPECT_FALSE(data_.has("com.quenta.knowledge"));
  timeline_.setWall(wallTimeOfSeconds(1'700'000'000.5));
  store_->donate(interaction());
  EXPECT_FALSE(data_.has("com.quenta.knowledge"));  // not on the caller's thread
  timeline_.runUntilIdle();
  EXPECT_THAT(
      rows("SELECT sql FROM sqlite_master ORDER BY name"),
      ElementsAre("CREATE TABLE app_activity(\"start\" REAL, \"end\" REAL, bundle_id TEXT, "
                  "unique_identifier TEXT, content_url TEXT, publicly_indexable INTEGER)",
                  "CREATE TABLE interaction(time REAL, domain TEXT, verb TEXT, parameters TEXT)"));
  EXPECT_THAT(rows("SELECT time, domain, verb, parameters FROM interaction"),
              ElementsAre("1700000000.5|Brelin|Engagement|{}"));
  struct stat status {};
  ASSERT_EQ(::stat((data_ / "com.quenta.knowledge").c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 0777, 0700u);
  ASSERT_EQ(::stat((data_ / kStoreFile).c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 0777, 0600u);
}

TEST_F(LinuxKnowledgeStoreTest, KeepsTextsAsTheyAreAndInOrder) {
  const std::vector<std::string> texts = {R"({"input":"it's \"quoted\"; DROP TABLE interaction"})",
                                          "{\"input\":\"Ünï – 雪 🎿\"}", R"({"input":"a\u0000b"})"};
  for (const auto& text : texts) store_->donate(interaction(text));
  store_.reset();  // writes what waits
  EXPECT_EQ(rows(), texts);
}

TEST_F(LinuxKnowledgeStoreTest, LeavesWhatOthersKeepThere) {
  store_->donate(interaction("1"));
  timeline_.runUntilIdle();
  rows("PRAGMA journal_mode=WAL");
  rows("INSERT INTO app_activity VALUES(1, 2, 'a', 'b', 'c', 1)");
  rows("INSERT INTO interaction VALUES(5, 'Other', 'v', '{}')");
  store_->donate(interaction("2"));
  timeline_.runUntilIdle();
  EXPECT_THAT(rows(), ElementsAre("1", "{}", "2"));
  EXPECT_THAT(rows("SELECT bundle_id FROM app_activity"), ElementsAre("a"));
  EXPECT_THAT(rows("PRAGMA journal_mode"), ElementsAre("wal"));
}

TEST_F(LinuxKnowledgeStoreTest, ForgetsWhatIsOldOrTooMuchOfTheDonatedDomain) {
  store_->donate(interaction("old"));
  store_->donate(interaction("other", "Lanthe"));
  timeline_.advance(28 * 24h + 1s);
  for (int i = 0; i < 1000; ++i) store_->donate(interaction("many"));
  timeline_.runUntilIdle();
  EXPECT_THAT(rows("SELECT DISTINCT parameters FROM interaction"), ElementsAre("other", "many"));
  rows(
      "INSERT INTO interaction SELECT time, domain, verb, parameters FROM interaction, "
      "(SELECT 1 FROM interaction LIMIT 20)");
  store_->donate(interaction("last"));
  timeline_.runUntilIdle();
  EXPECT_THAT(rows("SELECT domain, count(*), max(rowid) = (SELECT max(rowid) FROM interaction) "
                   "FROM interaction GROUP BY domain ORDER BY domain"),
              testing::Contains("Brelin|10000|1"));
}

TEST_F(LinuxKnowledgeStoreTest, KeepsAThousandThatWait) {
  for (int i = 0; i < 1500; ++i) store_->donate(interaction());
  timeline_.runUntilIdle();
  EXPECT_THAT(rows("SELECT count(*) FROM interaction"), ElementsAre("1000"));
}

// Whatever is wrong, donors notice nothing, and what is there stays as it is.
TEST_F(LinuxKnowledgeStoreTest, ComplainsOnceAboutAStoreThatTakesNothing) {
  const struct {
    const char* name;
    std::function<std::string()> prepare;  // gives the data home
    const char* reason;
  } cases[] = {
      {"no database",
       [this] {
         data_.write("a/com.quenta.knowledge/knowledge.db", std::string(10'000, 'x'));
         return data_ / "a";
       },
       "not a database"},
      {"another schema",
       [this] {
         data_.write("b/com.quenta.knowledge/knowledge.db", "");
         rowsOf(data_ / "b/com.quenta.knowledge/knowledge.db", "CREATE TABLE interaction(a)");
         return data_ / "b";
       },
       "interaction"},
      {"a directory of that name",
       [this] {
         data_.write("c/com.quenta.knowledge/knowledge.db/file", "");
         return data_ / "c";
       },
       "unable to open"},
      {"a file above it",
       [this] {
         data_.write("d", "");
         return data_ / "d";
       },
       "POSIXErrorDomain"},
      {"a file system that takes nothing", [] { return std::string("/proc"); }, "POSIXErrorDomain"},
  };
  for (const auto& wanted : cases) {
    SCOPED_TRACE(wanted.name);
    log_.clear();
    store_ = make(wanted.prepare());
    for (int i = 0; i < 3; ++i) {
      store_->donate(interaction("{\"input\":\"secret\"}"));
      timeline_.runUntilIdle();
    }
    ASSERT_EQ(log_.entries().size(), 1u);
    EXPECT_EQ(log_.entries()[0].level, LogLevel::Error);
    EXPECT_THAT(log_.entries()[0].text, HasSubstr(wanted.reason));
    EXPECT_THAT(log_.entries()[0].text, testing::Not(HasSubstr("secret")));
  }
  EXPECT_EQ(data_.read("a/com.quenta.knowledge/knowledge.db"), std::string(10'000, 'x'));
  EXPECT_THAT(
      rowsOf(data_ / "b/com.quenta.knowledge/knowledge.db", "SELECT name FROM sqlite_master"),
      ElementsAre("interaction"));
}

TEST_F(LinuxKnowledgeStoreTest, GoesOnWhenThereIsRoomAgain) {
  EXPECT_TRUE(succeedsInChild([this] {
    std::signal(SIGXFSZ, SIG_IGN);
    rlimit limit{};
    ::getrlimit(RLIMIT_FSIZE, &limit);
    const auto usual = limit.rlim_cur;
    limit.rlim_cur = 4096;
    ::setrlimit(RLIMIT_FSIZE, &limit);
    store_->donate(interaction("lost"));
    timeline_.runUntilIdle();
    limit.rlim_cur = usual;
    ::setrlimit(RLIMIT_FSIZE, &limit);
    store_->donate(interaction("kept"));
    timeline_.runUntilIdle();
    return log_.count(LogLevel::Error) == 1;
  }));
  EXPECT_THAT(rows(), ElementsAre("kept"));
}

TEST_F(LinuxKnowledgeStoreTest, DropsDonationsToADirectoryThatIsReadOnly) {
  data_.write("com.quenta.knowledge/other", "");
  ASSERT_EQ(::chmod(data_.path().c_str(), 0755), 0);
  ASSERT_EQ(::chmod((data_ / "com.quenta.knowledge").c_str(), 0555), 0);
  EXPECT_TRUE(succeedsInChild([this] {
    if (!dropPrivileges()) return false;
    store_->donate(interaction());
    timeline_.runUntilIdle();
    return log_.count(LogLevel::Error) == 1;
  }));
  EXPECT_FALSE(data_.has(kStoreFile));
}

}  // namespace
}  // namespace zelkord
