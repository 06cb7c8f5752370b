#include <gtest/gtest.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <functional>
#include <iterator>
#include <set>
#include <thread>

#include "platform/linux/process/LinuxProcess.h"
#include "platform/linux/process/ProcessStart.h"
#include "platform/linux/process/SystemRandom.h"
#include "platform/linux/process/TraceMarker.h"
#include "platform/linux/queues/LinuxWorkQueues.h"
#include "platform/testing/ForkedProcess.h"
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

TEST(ProcessStartTest, RaisesTheDescriptorLimitAsFarAsItGoes) {
  struct Case {
    rlimit before;
    rlim_t most;
    rlim_t after;
  };
  for (const auto& test : {Case{{256, 4096}, 65'536, 4096}, Case{{256, 4096}, 1024, 1024},
                           Case{{2048, 4096}, 1024, 2048}}) {
    SCOPED_TRACE(test.after);
    EXPECT_TRUE(succeedsInChild([&] {
      rlimit now{};
      return ::setrlimit(RLIMIT_NOFILE, &test.before) == 0 &&
             raiseDescriptorLimit(test.most) == test.after &&
             ::getrlimit(RLIMIT_NOFILE, &now) == 0 && now.rlim_cur == test.after &&
             now.rlim_max == test.before.rlim_max;
    }));
  }
}

TEST(ProcessStartTest, SignalsOfLeavingWaitAndNobodyLooksIntoTheProcess) {
  EXPECT_TRUE(succeedsInChild([] {
    prepareProcess();
    ::raise(SIGTERM);
    ::raise(SIGINT);
    const bool isClosed = ::umask(0) == 0077 && ::prctl(PR_GET_DUMPABLE, 0, 0, 0, 0) == 0;
    const auto leave = [](int) { ::_exit(0); };
    if (!isClosed || ::signal(SIGTERM, leave) == SIG_ERR || ::signal(SIGINT, leave) == SIG_ERR)
      return false;
    admitSignalsOfLeaving();
    return false;
  }));
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

TEST(SystemRandomTest, NothingComesTwice) {
  SystemRandom random;
  std::array<std::set<std::uint64_t>, 2> seen;
  const auto draw = [&random](std::set<std::uint64_t>& into) {
    for (std::size_t i = 0; i < 500; ++i) {
      std::array<std::uint64_t, 9> numbers{};
      const auto count = 1 + i % numbers.size();  // on both sides of what counts as small
      random.fill(numbers.data(), count * sizeof numbers[0]);
      into.insert(numbers.begin(), numbers.begin() + static_cast<std::ptrdiff_t>(count));
    }
  };
  draw(seen[0]);
  std::thread(draw, std::ref(seen[1])).join();
  const auto each = seen[0].size();
  seen[0].merge(seen[1]);
  EXPECT_EQ(each, 2490u);
  EXPECT_TRUE(seen[1].empty());
}

}  // namespace
}  // namespace zelkord
