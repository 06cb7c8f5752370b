#include <gmock/gmock.h>
#include <signal.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include "platform/linux/log/FileLog.h"
#include "platform/linux/log/JournalLog.h"
#include "platform/linux/log/LinuxLog.h"
#include "platform/linux/log/LogLine.h"
#include "platform/testing/ForkedProcess.h"
#include "platform/testing/ManualTimeline.h"
#include "platform/testing/TemporaryDirectory.h"

namespace zelkord {
namespace {

using testing::ElementsAre;

TEST(LogLineTest, IsOneLineAnEntry) {
  struct Case {
    double time;
    LogLevel level;
    std::string_view category;
    std::string_view text;
    const char* line;
  };
  const Case cases[] = {
      {1795375921.123456, LogLevel::Error, "Zelkor_Connection", "text",
       "2026-11-22T19:32:01.123456Z error Zelkor_Connection text"},
      {0, LogLevel::Fault, "", "", "1970-01-01T00:00:00.000000Z fault default "},
      {0.000001, LogLevel::Debug, "C", "a\nb\r\n\tc\\n\xC3\xBC",
       "1970-01-01T00:00:00.000001Z debug C a\\nb\\r\\n\\tc\\\\n\xC3\xBC"},
      {-0.5, LogLevel::Default, "C", "x", "1969-12-31T23:59:59.500000Z default C x"},
      {4102444800, LogLevel::Info, "C", "x", "2100-01-01T00:00:00.000000Z info C x"},
  };
  for (const auto& test : cases) {
    const WallTime time{
        std::chrono::round<std::chrono::microseconds>(std::chrono::duration<double>(test.time))};
    EXPECT_EQ(logLine(time, test.level, test.category, test.text), test.line);
  }
}

TEST(LogLevelTest, HasTheNamesOfTheCommandLine) {
  EXPECT_EQ(logLevelFromName("debug"), LogLevel::Debug);
  EXPECT_EQ(logLevelFromName("default"), LogLevel::Default);
  for (const char* other : {"fault", "", "DEBUG", "warning"}) {
    EXPECT_EQ(logLevelFromName(other), std::nullopt);
  }
}

TEST(LinuxLogTest, WritesAPrivateFileFromTheLevelOn) {
  const TemporaryDirectory root;
  ManualTimeline timeline;
  const auto old = ::umask(0);
  LinuxLog log(std::make_unique<FileLog>(root / "zelkord.log"), timeline, LogLevel::Error);
  ::umask(old);
  bool shows = false;
  log.showPrivateDataWhen([&] { return shows; });
  const Logger logger(log, "C");
  logger.notice("below");
  logger.error("typed {} by {}", priv("secret"), 7);
  shows = true;
  logger.fault("typed {}", priv("secret"));
  EXPECT_EQ(root.read("zelkord.log"),
            "2026-11-22T12:00:00.000000Z error C typed <private> by 7\n"
            "2026-11-22T12:00:00.000000Z fault C typed secret\n");
  struct stat status {};
  ::stat((root / "zelkord.log").c_str(), &status);
  EXPECT_EQ(status.st_mode & 07777, 0600u);
}

TEST(FileLogTest, AppendsAndRotates) {
  const TemporaryDirectory root;
  FileLog(root / "zelkord.log").write({}, LogLevel::Error, "C", "before the restart");
  FileLog log(root / "zelkord.log");
  EXPECT_THAT(root.read("zelkord.log"), testing::HasSubstr("before the restart\n"));
  const std::string large(1 << 20, 'x');
  for (int i = 0; i < 9; ++i) log.write({}, LogLevel::Error, "C", large);
  EXPECT_THAT(root.read("zelkord.1.log"), testing::HasSubstr("before the restart\n"));
  EXPECT_LT(root.read("zelkord.log").size(), std::size_t{8} << 20);
}

TEST(FileLogTest, SurvivesAFullDiskAndAMissingDirectory) {
  const TemporaryDirectory root;
  EXPECT_TRUE(succeedsInChild([&] {
    ::signal(SIGXFSZ, SIG_IGN);
    const rlimit limit{1000, 1000};
    ::setrlimit(RLIMIT_FSIZE, &limit);
    for (const auto& path : {root / "zelkord.log", root / "missing/zelkord.log"}) {
      FileLog log(path);
      log.write({}, LogLevel::Error, "C", std::string(5000, 'x'));
      log.flush();
    }
    return true;
  }));
}

// None of these may be opened: opening a pipe waits, and writing to the rest reaches others.
TEST(FileLogTest, WritesToARegularFileOnly) {
  const TemporaryDirectory root;
  root.write("victim", "");
  ASSERT_EQ(::symlink((root / "victim").c_str(), (root / "link").c_str()), 0);
  ASSERT_EQ(::symlink((root / "nowhere").c_str(), (root / "dangling").c_str()), 0);
  ASSERT_EQ(::mkfifo((root / "pipe").c_str(), 0600), 0);
  for (const auto& path :
       {root / "link", root / "dangling", root / "pipe", root.path(), std::string("/dev/full")}) {
    SCOPED_TRACE(path);
    testing::internal::CaptureStderr();
    FileLog log(path);
    log.write({}, LogLevel::Error, "C", "text");
    log.write({}, LogLevel::Error, "C", "text");
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              "zelkord: no log: " + path + " is no regular file\n");
    EXPECT_TRUE(FileLog::refusal(path));
  }
  EXPECT_EQ(root.read("victim"), "");
  EXPECT_FALSE(root.has("nowhere"));
  EXPECT_FALSE(FileLog::refusal(root / "victim") || FileLog::refusal(root / "new"));
}

// The lines of a log on a timeline.
struct FoldingBed {
  class Lines final : public LogOutput {
   public:
    explicit Lines(std::vector<std::string>& to) : to_(to) {}
    void write(WallTime time, LogLevel level, std::string_view category,
               std::string_view text) override {
      EXPECT_LE(logLine(time, level, category, text).size(), kLongestLogLine);
      to_.emplace_back(text);
    }
    void flush() override {}

   private:
    std::vector<std::string>& to_;
  };

  ManualTimeline timeline;
  std::vector<std::string> lines;
  LinuxLog log{std::make_unique<Lines>(lines), timeline, LogLevel::Default};
  Logger logger{log, "Zelkor_Feedback_Storage"};
};

TEST(LogFoldingTest, EqualLinesOfAPlaceAreToldOnceASecond) {
  FoldingBed bed;
  for (int i = 0; i < 1000; ++i) bed.logger.error("no room for {}", "records");
  EXPECT_THAT(bed.lines, testing::AllOf(testing::SizeIs(10), testing::Each("no room for records")));
  for (int i = 0; i < 10; ++i) bed.logger.error("no {} for records", "room");  // another place
  EXPECT_EQ(bed.lines.size(), 20u);
  bed.lines.clear();
  bed.timeline.advance(1s);
  EXPECT_THAT(bed.lines, testing::IsEmpty());  // nothing wakes up for it
  bed.logger.notice("another line");
  EXPECT_THAT(bed.lines, ElementsAre("repeated 990 times: no room for records", "another line"));
  for (int i = 0; i < 12; ++i) bed.logger.error("at the end");
  bed.log.flush();
  bed.log.flush();
  EXPECT_EQ(bed.lines.size(), 2u + 10 + 1);
  EXPECT_EQ(bed.lines.back(), "repeated 2 times: at the end");
}

TEST(LogFoldingTest, APlaceWhoseLinesDifferIsBoundedToo) {
  FoldingBed bed;
  for (int i = 0; i < 550'000; ++i) bed.logger.error("image {} refused", i);
  EXPECT_EQ(bed.lines.size(), LogFolding::kLines);
  bed.timeline.advance(1s);
  bed.logger.error("image {} refused", 7);
  ASSERT_EQ(bed.lines.size(), LogFolding::kLines + 2);
  EXPECT_EQ(bed.lines[LogFolding::kLines],
            "548000 more lines like this one left out: image 549999 refused");
}

TEST(LogFoldingTest, LeavesAloneWhatManyTypingClientsCause) {
  FoldingBed bed;
  const std::string about(100, 'x');
  for (int key = 0; key < 65'000; ++key) {
    bed.logger.notice("search {} begins, {}", key, about);
    if (key % 1000 == 999) bed.timeline.advance(1s);
  }
  EXPECT_EQ(bed.lines.size(), 65'000u);
}

TEST(LogFoldingTest, LongLinesOfAPlaceAreBoundedByTheirBytes) {
  FoldingBed bed;
  const auto bytesOf = [&](int seconds) {
    bed.lines.clear();
    for (int second = 0; second < seconds; ++second) {
      for (int i = 0; i < 500; ++i) {
        bed.logger.notice("client configuration {} {}", i, std::string(8'000, 'x'));
      }
      bed.timeline.advance(1s);
    }
    std::size_t bytes = 0;
    for (const auto& line : bed.lines) bytes += line.size();
    return bytes;
  };
  EXPECT_LE(bytesOf(1), LogFolding::kBytesOfASecond);
  EXPECT_GT(bytesOf(1), LogFolding::kBytesOfASecond / 2);
  // Besides the line a second that tells how many are left out.
  EXPECT_LE(bytesOf(57), LogFolding::kBytesOfAMinute + 57 * kLongestLogLine);
  bed.lines.clear();
  bed.logger.error("another place");
  EXPECT_THAT(bed.lines, testing::Contains("another place"));
  bed.timeline.advance(2s);
  EXPECT_GT(bytesOf(1), LogFolding::kBytesOfASecond / 2) << "in the next minute";
}

TEST(LogFoldingTest, LongTextsAreCutAtACharacter) {
  FoldingBed bed;
  std::string text(64 * 1024, 'x');
  for (int shift = 0; shift < 4; ++shift) {
    for (std::size_t i = static_cast<std::size_t>(shift); i + 1 < text.size(); i += 2) {
      text.replace(i, 2, "\u00E9");
    }
    bed.logger.error("{}", text);
  }
  bed.logger.error("{}", std::string(64 * 1024, '\n'));
  bed.logger.error("{}", std::string(3'500, 'y'));
  for (const auto& line : bed.lines) {
    const auto mark = line.find("... (");
    EXPECT_NE(mark == std::string::npos, line.size() != 3'500) << line.size();
    const auto last = mark == std::string::npos ? line.size() : mark;
    EXPECT_NE(line[last - 1], '\xC3') << "half a character";
  }
}

TEST(JournalLogTest, SendsTheFields) {
  std::vector<std::string> fields;
  JournalLog log([&](const std::vector<std::string>& sent) { fields = sent; });
  log.write({}, LogLevel::Default, "", "two\nlines");
  EXPECT_THAT(fields, ElementsAre("MESSAGE=two\nlines", "PRIORITY=5", "SYSLOG_IDENTIFIER=zelkord",
                                  "SUBSYSTEM=com.quenta.zelkord", "CATEGORY=default"));
}

}  // namespace
}  // namespace zelkord
