#include <gtest/gtest.h>
#include <sqlite3.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>
#include <functional>
#include <thread>

#include "platform/linux/url_cache/URLCacheTestSupport.h"
#include "platform/testing/ForkedProcess.h"

namespace zelkord {
namespace {

const std::string kMappedBody(20'000, 'm');
const std::string kBodyFile = "urlcache/0000000000000001.body";
const std::string kIndexFile = "urlcache/index.db";

void runSQL(const std::string& path, const char* sql) {
  sqlite3* database = nullptr;
  ASSERT_EQ(sqlite3_open(path.c_str(), &database), SQLITE_OK);
  EXPECT_EQ(sqlite3_exec(database, sql, nullptr, nullptr, nullptr), SQLITE_OK) << sql;
  sqlite3_close(database);
}

void flipByte(const TemporaryDirectory& state, const std::string& name, std::size_t place) {
  auto bytes = state.read(name);
  ASSERT_LT(place, bytes.size());
  bytes[place] = static_cast<char>(bytes[place] ^ 1);
  state.write(name, bytes);
}

TEST(LinuxURLCacheDamageTest, GivesOutNothingThatWasDamaged) {
  const struct {
    const char* name;
    std::function<void(const TemporaryDirectory&)> damage;
    bool smallStays;  // the other entry, which is in the index
    int errors;
  } cases[] = {
      {"none", [](const auto&) {}, true, 0},
      {"truncated", [](const auto& state) { state.write(kBodyFile, kMappedBody.substr(1)); }, true,
       0},
      {"empty", [](const auto& state) { state.write(kBodyFile, ""); }, true, 0},
      {"flipped byte", [](const auto& state) { flipByte(state, kBodyFile, 12'345); }, true, 0},
      {"missing", [](const auto& state) { ::unlink((state / kBodyFile).c_str()); }, true, 0},
      {"symlink",
       [](const auto& state) {
         std::filesystem::rename(state / kBodyFile, state / "elsewhere");
         std::filesystem::create_symlink(state / "elsewhere", state / kBodyFile);
       },
       true, 0},
      {"pipe",
       [](const auto& state) {
         ::unlink((state / kBodyFile).c_str());
         ::mkfifo((state / kBodyFile).c_str(), 0600);
       },
       true, 0},
      {"changed headers",
       [](const auto& state) {
         runSQL(state / kIndexFile, "UPDATE entries SET head = zeroblob(32) WHERE id = 1");
       },
       true, 0},
      {"another URL's",
       [](const auto& state) {
         runSQL(state / kIndexFile, "UPDATE entries SET vary = '\"' WHERE id = 1");
       },
       true, 0},
      {"senseless row",
       [](const auto& state) {
         runSQL(state / kIndexFile, "UPDATE entries SET variant = 'x' WHERE id = 1");
       },
       true, 0},
      {"garbage", [](const auto& state) { state.write(kIndexFile, std::string(9000, '?')); }, false,
       1},
      {"broken page",
       [](const auto& state) {
         auto bytes = state.read(kIndexFile);
         std::fill(bytes.begin() + 4096, bytes.end(), '\xAA');
         state.write(kIndexFile, bytes);
       },
       false, 1},
      {"empty index", [](const auto& state) { state.write(kIndexFile, ""); }, false, 0},
      {"another version",
       [](const auto& state) { runSQL(state / kIndexFile, "PRAGMA user_version = 1"); }, false, 1},
      {"another program's",
       [](const auto& state) { runSQL(state / kIndexFile, "PRAGMA application_id = 2"); }, false,
       1},
      {"a trigger",
       [](const auto& state) {
         runSQL(state / kIndexFile,
                "CREATE TRIGGER t BEFORE INSERT ON entries BEGIN SELECT RAISE(IGNORE); END");
       },
       false, 1},
      {"a view in the table's place",
       [](const auto& state) {
         runSQL(state / kIndexFile,
                "DROP TABLE entries; CREATE VIEW entries AS WITH RECURSIVE n(id) AS"
                " (SELECT 1 UNION ALL SELECT id + 1 FROM n) SELECT id, zeroblob(32) AS url,"
                " '' AS vary, zeroblob(32) AS variant, 0 AS cost, 0 AS used, 0 AS scope FROM n");
       },
       false, 1},
      {"rows without end",
       [](const auto& state) {
         runSQL(state / kIndexFile,
                "WITH RECURSIVE n(i) AS (SELECT 3 UNION ALL SELECT i + 1 FROM n LIMIT 20000)"
                " INSERT INTO entries SELECT i, zeroblob(32), '', zeroblob(32), 0, 0, '', '', 0,"
                " '', 0 FROM n");
       },
       false, 1},
      {"a body of a terabyte",
       [](const auto& state) {
         std::filesystem::resize_file(state / kBodyFile, std::uintmax_t{1} << 40);
         runSQL(state / kIndexFile, "UPDATE entries SET size = 1 << 40 WHERE id = 1");
       },
       true, 0},
      {"other columns",
       [](const auto& state) {
         runSQL(state / kIndexFile, "ALTER TABLE entries DROP COLUMN head");
       },
       false, 1},
      {"no folder", [](const auto& state) { std::filesystem::remove_all(state / "urlcache"); },
       false, 0},
  };
  for (const auto& [name, damage, smallStays, errors] : cases) {
    SCOPED_TRACE(name);
    const TemporaryDirectory state;
    URLCacheTestBed bed(state / "urlcache");
    bed.store("http://h/mapped", kMappedBody);
    bed.store("http://h/small", "small");
    bed.stop();
    damage(state);
    bed.start();
    const bool isWhole = std::string_view(name) == "none";
    EXPECT_EQ(bed.find("http://h/mapped").has_value(), isWhole);
    EXPECT_EQ(bed.find("http://h/small").has_value(), smallStays);
    // And everything goes on.
    bed.store("http://h/mapped", kMappedBody);
    bed.restart();
    EXPECT_EQ(bed.find("http://h/mapped"), kMappedBody);
    EXPECT_EQ(bed.log.count(LogLevel::Error), errors);
  }
}

TEST(LinuxURLCacheDamageTest, OutlivesFilesThatAreCutWhileTheyAreHeldAndRead) {
  const std::string body(1'000'000, 'b');  // not held in memory
  for (int round = 0; round < 10; ++round) {
    const TemporaryDirectory state;
    URLCacheTestBed bed(state / "urlcache");
    bed.store("http://h/a", body);
    bed.restart();
    const auto held = bed.cache->lookup({.url = "http://h/a"});
    ASSERT_TRUE(held);
    std::thread cutter([&] {
      std::this_thread::sleep_for(round * 200us);
      std::filesystem::resize_file(state / kBodyFile, 5000);
    });
    for (int i = 0; i < 5; ++i) {
      const auto found = bed.find("http://h/a");
      EXPECT_TRUE(!found || *found == body);
    }
    cutter.join();
    EXPECT_TRUE(held->data.view() == body);
    EXPECT_FALSE(bed.find("http://h/a"));
  }
}

TEST(LinuxURLCacheDamageTest, BeginsAnewWhenItsFolderGoes) {
  const TemporaryDirectory state;
  URLCacheTestBed bed(state / "urlcache", {1000, 10 << 20, 4096});
  bed.store("http://h/mapped", kMappedBody);
  bed.restart();
  EXPECT_TRUE(bed.find("http://h/mapped"));
  std::filesystem::remove_all(state / "urlcache");
  for (int i = 0; i < 3 && !state.has(kIndexFile); ++i) {
    bed.store("http://h/mapped", kMappedBody);
    bed.cache->purgeMemory();
    bed.restart();
  }
  EXPECT_EQ(bed.find("http://h/mapped"), kMappedBody);
}

// An old response must not come back in the place of a newer one.
TEST(LinuxURLCacheDamageTest, BeginsAnewWhereItCouldNotReadWhatIsThere) {
  const TemporaryDirectory state;
  URLCacheTestBed bed(state / "urlcache");
  bed.store("http://h/first", "first");
  bed.store("http://h/a", "old");
  bed.stop();
  std::filesystem::rename(state / kIndexFile, state / "aside");
  std::filesystem::create_directory(state / kIndexFile);
  bed.start();
  EXPECT_EQ(bed.find("http://h/a"), std::nullopt);
  std::filesystem::remove(state / kIndexFile);
  std::filesystem::rename(state / "aside", state / kIndexFile);
  bed.store("http://h/a", "new");
  bed.restart();
  EXPECT_EQ(bed.find("http://h/a"), "new");
  EXPECT_EQ(bed.find("http://h/first"), std::nullopt);
}

// Stores forever; each body says which URL it belongs to.
std::string numberedBody(int number) {
  const auto text = std::to_string(number % 100) + ",";
  std::string body;
  while (body.size() < (number % 2 ? 8'000u : 500u)) body += text;
  return body;
}

TEST(LinuxURLCacheDamageTest, SurvivesBeingKilledWhileItWrites) {
  const TemporaryDirectory state;
  int found = 0;
  for (int round = 0; round < 6; ++round) {
    const pid_t child = ::fork();
    if (child == 0) {
      URLCacheTestBed bed(state / "urlcache", {10'000, 200'000, 4096});
      for (int i = 0;; ++i) bed.store("http://h/" + std::to_string(i % 100), numberedBody(i));
    }
    ASSERT_GT(child, 0);
    ::usleep(static_cast<useconds_t>(60'000 + round * 7'001));
    ::kill(child, SIGKILL);
    ASSERT_EQ(::waitpid(child, nullptr, 0), child);
    EXPECT_TRUE(succeedsInChild([&] {
      URLCacheTestBed bed(state / "urlcache", {10'000, 200'000, 4096});
      bool right = true;
      int hits = 0;
      for (int i = 0; i < 100; ++i) {
        const auto body = bed.find("http://h/" + std::to_string(i));
        right = right && (!body || body == numberedBody(i));
        hits += body ? 1 : 0;
      }
      state.write("hits", std::to_string(hits));
      return right && bed.log.entries().empty();
    }));
    found += std::stoi(state.read("hits"));
  }
  EXPECT_GT(found, 0);
}

void limitFileSize(rlim_t bytes) {
  rlimit limit{};
  ::getrlimit(RLIMIT_FSIZE, &limit);
  limit.rlim_cur = bytes;
  ::setrlimit(RLIMIT_FSIZE, &limit);
}

TEST(LinuxURLCacheDamageTest, GoesOnWithoutTheDiskWhileItIsFull) {
  const TemporaryDirectory state;
  EXPECT_TRUE(succeedsInChild([&] {
    ::signal(SIGXFSZ, SIG_IGN);
    const std::string kept(8'000, 'k'), refused(200'000, 'r');
    URLCacheTestBed bed(state / "urlcache", {20'000, 10 << 20, 4096});
    bed.store("http://h/before", kept);
    bed.restart();
    bool right = bed.find("http://h/before") == kept;
    limitFileSize(100'000);
    for (int i = 0; i < 3; ++i) bed.store("http://h/refused", refused);
    bed.restart();
    right = right && !bed.find("http://h/refused") && bed.find("http://h/before") == kept;
    right = right && bed.log.count("cannot be written") == 1;
    limitFileSize(RLIM_INFINITY);
    bed.store("http://h/refused", refused);
    bed.restart();
    return right && bed.find("http://h/refused") == refused && bed.log.entries().size() == 1;
  }));
}

TEST(LinuxURLCacheDamageTest, WorksInMemoryWhereItMayNotWrite) {
  const TemporaryDirectory state;
  state.write("urlcache", "a file in the folder's place");
  URLCacheTestBed bed(state / "urlcache");
  bed.store("http://h/a", "body");
  for (int i = 0; i < 3; ++i) EXPECT_EQ(bed.find("http://h/a"), "body");
  bed.stop();
  EXPECT_EQ(bed.log.count("cannot be written"), 1);
}

}  // namespace
}  // namespace zelkord
