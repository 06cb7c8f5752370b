#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <filesystem>
#include <thread>

#include "platform/linux/loop/Loop.h"
#include "platform/linux/watch/PathWatcher.h"
#include "platform/testing/RecordingLog.h"
#include "platform/testing/TemporaryDirectory.h"

namespace zelkord {
namespace {

using namespace std::chrono_literals;

bool soon(const std::function<bool()>& condition) {
  const auto limit = std::chrono::steady_clock::now() + 10s;
  while (!condition() && std::chrono::steady_clock::now() < limit) {
    std::this_thread::sleep_for(100us);
  }
  return condition();
}

// The watcher looks for what exists while its directories are being made: what comes between its
// look and its watch must not be lost, now or at the file's next change.
TEST(PathWatcherTest, SeesAFileWhateverItsDirectoriesDoMeanwhile) {
  const TemporaryDirectory root;
  RecordingLog log;
  Loop loop("zk-test");
  PathWatcher watcher(loop, log);
  for (int round = 0; round < 100; ++round) {
    SCOPED_TRACE(round);
    const std::string file = "at" + std::to_string(round) + "/b/c/d/e/f/file";
    std::atomic<std::size_t> seen = 0;
    const auto watching = watcher.watch(root / file, [&] { seen = root.read(file).size(); });
    root.write(file, "x");
    ASSERT_TRUE(soon([&] { return seen == 1; }));
    root.write("new", "xx");
    std::filesystem::rename(root / "new", root / file);
    ASSERT_TRUE(soon([&] { return seen == 2; }));
  }
}

}  // namespace
}  // namespace zelkord
