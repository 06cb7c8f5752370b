#include <gmock/gmock.h>
#include <sqlite3.h>

#include "platform/linux/files/LinuxFileManager.h"
#include "platform/linux/knowledge/LinuxKnowledgeStore.h"
#include "platform/linux/queues/LinuxWorkQueues.h"
#include "platform/linux/settings/LinuxSettings.h"
#include "platform/testing/RecordingLog.h"
#include "platform/testing/TemporaryDirectory.h"

namespace zelkord {
namespace {

// Another program that holds a database for itself.
class ExclusiveHolder final {
 public:
  explicit ExclusiveHolder(const std::string& path) {
    EXPECT_EQ(sqlite3_open_v2(path.c_str(), &database_, SQLITE_OPEN_READWRITE, nullptr), SQLITE_OK);
    EXPECT_EQ(sqlite3_exec(database_, "BEGIN EXCLUSIVE", nullptr, nullptr, nullptr), SQLITE_OK);
  }
  ~ExclusiveHolder() { sqlite3_close_v2(database_); }
  ExclusiveHolder(const ExclusiveHolder&) = delete;
  ExclusiveHolder& operator=(const ExclusiveHolder&) = delete;

 private:
  sqlite3* database_ = nullptr;
};

// As many databases as there are workers: each would keep one of them for its busy time-out.
TEST(LockedDatabaseTest, WhoeverWaitsForItLeavesTheWorkersToOthers) {
  const TemporaryDirectory root;
  const LinuxClock clock;
  LinuxWorkQueues queues(clock, 2);
  RecordingLog log;
  LinuxFileManager files({root.path(), root.path(), root.path()});
  LinuxSettings settings({root / "defaults.db", {}, 5s}, files, queues, log);
  LinuxKnowledgeStore knowledge(root.path(), files, queues, clock, log);
  knowledge.donate({"/app/intents", "Engagement", "{}", clock.wallNow()});
  knowledge.flush();
  const ExclusiveHolder settingsHolder(root / "defaults.db");
  const ExclusiveHolder knowledgeHolder(root / "com.quenta.knowledge/knowledge.db");

  settings.set("key", "value");
  knowledge.donate({"/app/intents", "Engagement", "{}", clock.wallNow()});
  const auto deadline = clock.realNow() + 20s;
  while (queues.workers().blocked < 2 && clock.realNow() < deadline) std::this_thread::yield();

  const auto start = clock.realNow();
  const auto done = queues.makeSemaphore(0);
  for (int client = 0; client < 10; ++client) {
    queues.global(QualityOfService::Default).async([&] {
      EXPECT_EQ(settings.value("key"), json::value("value"));
      done->signal();
    });
  }
  for (int client = 0; client < 10; ++client) EXPECT_TRUE(done->wait(20s));
  EXPECT_LT(clock.realNow() - start, 800ms);  // the shorter of the two waits takes a second
}

}  // namespace
}  // namespace zelkord
