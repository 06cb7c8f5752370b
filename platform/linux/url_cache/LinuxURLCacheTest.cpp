#include <gtest/gtest.h>
#include <sys/stat.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <thread>
#include <vector>

#include "platform/linux/url_cache/LinuxURLCache.h"
#include "platform/linux/url_cache/URLCacheTestSupport.h"

namespace zelkord {
namespace {

namespace fs = std::filesystem;

constexpr auto kByHand = CacheScopes::kByHand;

std::string bigBody(char c) { return std::string(20'000, c); }

int countOfBodies(const std::string& folder) {
  const fs::directory_iterator files(folder);
  return static_cast<int>(std::count_if(begin(files), end(files), [](const auto& file) {
    return file.path().extension() == ".body";
  }));
}

class LinuxURLCacheTest : public ::testing::Test {
 protected:
  TemporaryDirectory state_;
  URLCacheTestBed bed_{state_ / "urlcache"};
};

TEST_F(LinuxURLCacheTest, FindsWhatWasStoredAtOnceAndAfterARestart) {
  const HTTPHeaders german = {{"Accept-Language", "de"}};
  bed_.store("http://h/small", "old");
  bed_.store("http://h/small#part", "small", {{"Cache-Control", "no-store"}});
  bed_.store("http://h/empty", "");
  bed_.store("http://h/big", bigBody('b'));
  bed_.cache->store({.url = "http://h/vary", .headers = german},
                    {{.status = 404, .headers = {{"Vary", "accept-language"}}}, Data("de")});
  bed_.store("http://h/never", "x", {{"Vary", "*"}});
  for (const char* when : {"at once", "after a restart", "from memory"}) {
    SCOPED_TRACE(when);
    EXPECT_EQ(bed_.find("http://h/small"), "small");
    EXPECT_EQ(bed_.find("http://h/empty"), "");
    EXPECT_EQ(bed_.find("http://h/big"), bigBody('b'));
    EXPECT_EQ(bed_.find("http://h/vary", german), "de");
    for (const char* other : {"http://h/vary", "http://h/never", "http://h/smal", ""}) {
      EXPECT_EQ(bed_.find(other), std::nullopt) << other;
    }
    const auto found = bed_.cache->lookup({.url = "http://h/vary", .headers = german});
    ASSERT_TRUE(found);
    EXPECT_EQ(found->response.url, "http://h/vary");
    EXPECT_EQ(found->response.status, 404);
    EXPECT_EQ(found->response.header("vary"), "accept-language");
    if (std::string_view(when) == "at once") bed_.restart();
  }
  EXPECT_EQ(countOfBodies(bed_.folder), 1);
  EXPECT_EQ(bed_.log.entries().size(), 0u);
}

TEST_F(LinuxURLCacheTest, TouchesNoFileBeforeThereIsSomethingToKeep) {
  EXPECT_TRUE(bed_.cache->mayHave(kByHand, "http://h/"));
  EXPECT_EQ(bed_.find("http://h/"), std::nullopt);
  EXPECT_FALSE(bed_.cache->mayHave(kByHand, "http://h/"));
  bed_.restart();
  EXPECT_FALSE(state_.has("urlcache"));
  EXPECT_EQ(bed_.log.entries().size(), 0u);
}

TEST_F(LinuxURLCacheTest, WritesNoURLAndNothingForOthersToRead) {
  bed_.store("http://h/?q=secret%20text", bigBody('s'));
  bed_.store("http://h/secret?q=more", "small");
  bed_.stop();
  EXPECT_EQ(fs::status(bed_.folder).permissions(), fs::perms::owner_all);
  for (const auto& file : fs::directory_iterator(bed_.folder)) {
    const auto name = file.path().filename().string();
    EXPECT_EQ(file.status().permissions(), fs::perms::owner_read | fs::perms::owner_write) << name;
    EXPECT_EQ(state_.read("urlcache/" + name).find("secret"), std::string::npos) << name;
  }
}

TEST_F(LinuxURLCacheTest, KeepsWhatIsReadAliveWhenItIsReplacedOrPurged) {
  bed_.store("http://h/a", bigBody('1'));
  bed_.restart();
  const auto old = bed_.cache->lookup({.url = "http://h/a"});
  bed_.store("http://h/a", bigBody('2'));
  EXPECT_EQ(bed_.find("http://h/a"), bigBody('2'));
  bed_.cache->purgeMemory();
  bed_.restart();
  EXPECT_EQ(countOfBodies(bed_.folder), 1);
  ASSERT_TRUE(old);
  EXPECT_EQ(old->data.view(), bigBody('1'));
}

TEST_F(LinuxURLCacheTest, PurgesMemoryOnly) {
  bed_.store("http://h/a", bigBody('a'));
  bed_.cache->purgeMemory();
  EXPECT_EQ(bed_.find("http://h/a"), bigBody('a'));
  bed_.restart();
  EXPECT_EQ(bed_.find("http://h/a"), bigBody('a'));
  for (const auto& file : fs::directory_iterator(bed_.folder)) {
    if (file.path().extension() == ".body") fs::remove(file);
  }
  EXPECT_EQ(bed_.find("http://h/a"), bigBody('a')) << "held in memory";
  bed_.cache->purgeMemory();
  EXPECT_EQ(bed_.find("http://h/a"), std::nullopt);
}

TEST_F(LinuxURLCacheTest, ForgetsAllVariantsOfAURL) {
  bed_.store("http://h/a", bigBody('a'), {{"Vary", "X"}});
  bed_.store("http://h/b", bigBody('b'));
  bed_.restart();
  bed_.cache->forget(kByHand, "http://h/a");
  bed_.cache->forget(kByHand, "http://h/none");
  EXPECT_FALSE(bed_.cache->mayHave(kByHand, "http://h/a") && bed_.find("http://h/a"));
  bed_.restart();
  EXPECT_EQ(bed_.find("http://h/a"), std::nullopt);
  EXPECT_EQ(bed_.find("http://h/b"), bigBody('b'));
  EXPECT_EQ(countOfBodies(bed_.folder), 1);
}

TEST(LinuxURLCacheLimitsTest, KeepsTheDiskPartWithinItsLimit) {
  TemporaryDirectory state;
  URLCacheTestBed bed(state / "urlcache",
                      {.memoryBytes = 8'000, .diskBytes = 210'000, .minimumMappedBytes = 16'384});
  const auto url = [](int i) { return "http://h/" + std::to_string(i); };
  for (int i = 0; i < 5; ++i) bed.store(url(i), bigBody('a'));
  for (int i = 5; i < 15; ++i) bed.store(url(i), std::string(10'000, 'b'));
  EXPECT_EQ(bed.find(url(0)), bigBody('a'));
  bed.store("http://h/large", std::string(21'001, 'c'));
  EXPECT_EQ(bed.find("http://h/large"), std::nullopt) << "over a tenth";
  bed.restart();
  // The order of use is kept.
  bed.store(url(20), bigBody('a'));
  bed.restart();
  for (int i = 0; i < 15; ++i) {
    EXPECT_EQ(bed.find(url(i)).has_value(), i != 1) << i;
  }
  EXPECT_EQ(countOfBodies(bed.folder), 5);
  for (int i = 0; i < 21; ++i) bed.cache->forget(kByHand, url(i));
  bed.stop();
  EXPECT_LT(fs::file_size(bed.folder + "/index.db"), 40'000u) << "room is given back";
}

TEST_F(LinuxURLCacheTest, RemovesFilesOfWhichNobodyKnows) {
  bed_.store("http://h/a", bigBody('a'));
  bed_.stop();
  const char* const orphans[] = {"urlcache/0000000000000002.body", "urlcache/00000000000000ff.body",
                                 "urlcache/x.body"};
  for (const char* name : orphans) state_.write(name, "left over");
  bed_.start();
  // It takes the name of an orphan.
  bed_.store("http://h/b", bigBody('b'));
  bed_.restart();
  EXPECT_EQ(bed_.find("http://h/a"), bigBody('a'));
  EXPECT_EQ(bed_.find("http://h/b"), bigBody('b'));
  bed_.restart();
  EXPECT_EQ(countOfBodies(bed_.folder), 2);
}

TEST_F(LinuxURLCacheTest, RemovesNothingBehindALink) {
  fs::create_directory(state_ / "elsewhere");
  const char* const theirs[] = {"elsewhere/0000000000000001.body", "elsewhere/index.db"};
  for (const char* name : theirs) state_.write(name, "of somebody else");
  fs::create_directory_symlink(state_ / "elsewhere", bed_.folder);
  EXPECT_EQ(bed_.find("http://h/"), std::nullopt);
  bed_.store("http://h/", "body");
  bed_.stop();
  for (const char* name : theirs) EXPECT_EQ(state_.read(name), "of somebody else") << name;
}

// Whether the bytes are anywhere in the cache's files.
bool isOnDisk(const std::string& folder, const std::string& bytes) {
  for (const auto& file : fs::directory_iterator(folder)) {
    std::ifstream stream(file.path(), std::ios::binary);
    const std::string all{std::istreambuf_iterator<char>(stream), {}};
    if (all.find(bytes) != std::string::npos) return true;
  }
  return false;
}

TEST_F(LinuxURLCacheTest, LeavesNothingOfAnEndedIdentityOnTheDisk) {
  const URLRequest request{.url = "http://h/hand"};
  const auto keep = [&](const std::string& who, const std::string& body) {
    bed_.cache->keep(bed_.cache->scopeOf(who), {.url = "http://h/" + who},
                     {{.status = 200, .headers = {{"ETag", "tag of " + who}}}, Data(body)});
  };
  const auto isThere = [&](const char* tag) {
    bed_.cache->lookup(request);  // what waits to be written is
    return isOnDisk(bed_.folder, tag);
  };
  for (const bool killed : {false, true}) {
    SCOPED_TRACE(killed);
    bed_.restart();
    bed_.store(request.url, bigBody('h'), {{"ETag", "tag by hand"}});
    keep("b", "small");
    keep("", "nobody's");
    keep("a", bigBody('a'));
    keep("c", "small");
    bed_.restart();  // all is written, nothing removed, as when it is killed
    for (const char* tag : {"tag of a", "tag of b", "tag of c", "tag by hand"}) {
      EXPECT_TRUE(isOnDisk(bed_.folder, tag));
    }
    if (!killed) {
      bed_.find("");  // opens it
      for (const char* who : {"a", "b", "", "c"}) keep(who, bigBody('x'));
      for (const char* who : {"a", "b"}) bed_.cache->endIdentity(who);
      keep("a", "too late");
    }
    bed_.cache->purgeMemory();
    EXPECT_TRUE(bed_.find(request.url) == bigBody('h')) << "what is kept by hand stays";
    bed_.cache->purgeMemory();
    EXPECT_TRUE(bed_.find(request.url) == bigBody('h')) << "after the writing";
    EXPECT_FALSE(isThere("tag of a"));
    EXPECT_FALSE(isThere("tag of b"));
    EXPECT_EQ(isThere("tag of c"), !killed) << "whose identity lives on";
    EXPECT_TRUE(isThere("tag by hand"));
    EXPECT_EQ(countOfBodies(bed_.folder), killed ? 1 : 2);
  }
}

TEST_F(LinuxURLCacheTest, EndsWhileItOpens) {
  bed_.store("http://h/a", bigBody('a'));
  for (int i = 0; i < 50; ++i) {
    bed_.restart();
    if (i % 2 == 0) {
      bed_.cache->mayHave(kByHand, "http://h/a");
    } else {
      bed_.cache->find(kByHand, {.url = "http://h/a"}, [](const StoredPointer&) {});
    }
  }
  bed_.restart();
  EXPECT_EQ(bed_.find("http://h/a"), bigBody('a'));
}

TEST_F(LinuxURLCacheTest, StoresAndFindsOnManyThreads) {
  const auto body = [](int key) {
    return std::string(key % 2 ? 6'000 : 100, char('a' + key % 26));
  };
  std::vector<std::thread> threads;
  std::atomic<int> wrong = 0, hits = 0;
  for (int seed = 0; seed < 4; ++seed) {
    threads.emplace_back([&, seed] {
      for (int i = 0; i < 300; ++i) {
        const int key = (i * 7 + seed * 13) % 40;
        const auto url = "http://h/" + std::to_string(key);
        if (i % 3 == 0) bed_.store(url, body(key));
        if (i % 50 == 49) bed_.cache->purgeMemory();
        if (i % 31 == 30) bed_.cache->forget(kByHand, url);
        const auto found = bed_.find(url);
        if (found) ++(*found == body(key) ? hits : wrong);
      }
    });
  }
  for (auto& thread : threads) thread.join();
  EXPECT_EQ(wrong, 0);
  EXPECT_GT(hits, 0);
  EXPECT_EQ(bed_.log.entries().size(), 0u);
}

}  // namespace
}  // namespace zelkord
