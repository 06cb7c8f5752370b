#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <iterator>

#include "platform/linux/process/LinuxProcess.h"
#include "platform/linux/process/SystemRandom.h"
#include "platform/linux/process/TraceMarker.h"
#include "platform/linux/queues/LinuxWorkQueues.h"
#include "platform/testing/RecordingLog.h"

namespace zelkord {
namespace {

TEST(LinuxProcessTest, ExitRunsItsHooksInOrderAndNothingElse) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  const auto run = [](bool again) {
    LinuxClock clock;
    LinuxWorkQueues queues(clock);
    LinuxProcess process(queues);
    std::atexit([] { std::fputs("atexit ", stderr); });
    process.atExit([] { std::fputs("counters ", stderr); });
    process.atExit([&] {
      std::fputs("log", stderr);
      if (again) process.exit(4);
    });
    process.atExit([] { std::fputs(" end", stderr); });
    queues.main().async([&] { process.exit(3); });
    process.runMainLoop();
  };
  EXPECT_EXIT(run(false), testing::ExitedWithCode(3), "^counters log end$");
  EXPECT_EXIT(run(true), testing::ExitedWithCode(4), "^counters log$");
}

TEST(TraceMarkerTest, WritesOneLineACode) {
  std::string path = testing::TempDir() + "trace_marker_XXXXXX";
  ::close(::mkstemp(path.data()));
  RecordingLog log;
  {
    TraceMarker trace(Logger(log, "default"), path);
    for (const std::uint32_t code : {0u, 17u, 4'294'967'295u}) trace.emit(code);
  }
  std::ifstream file(path);
  const std::string text{std::istreambuf_iterator<char>(file), {}};
  EXPECT_EQ(text, "zelkord: 0\nzelkord: 17\nzelkord: 4294967295\n");
  EXPECT_TRUE(log.entries().empty());
  ::unlink(path.c_str());
}

TEST(TraceMarkerTest, AHostWithoutTracingIsLoggedOnce) {
  RecordingLog log;
  TraceMarker trace(Logger(log, "default"), "/nonexistent/trace_marker");
  EXPECT_TRUE(log.entries().empty());
  for (int i = 0; i < 3; ++i) trace.emit(1);
  EXPECT_EQ(log.entries().size(), 1u);
}

TEST(SystemRandomTest, FillsEveryByte) {
  std::string seen(1000, '\0'), bytes(1000, '\0');
  SystemRandom random;
  for (int i = 0; i < 8; ++i) {
    random.fill(bytes.data(), bytes.size());
    for (std::size_t j = 0; j < seen.size(); ++j) seen[j] = static_cast<char>(seen[j] | bytes[j]);
  }
  EXPECT_EQ(seen.find('\0'), std::string::npos);
}

}  // namespace
}  // namespace zelkord
