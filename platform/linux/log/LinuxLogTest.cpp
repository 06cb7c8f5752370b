#include <gmock/gmock.h>
#include <sys/stat.h>

#include "platform/linux/log/FileLog.h"
#include "platform/linux/log/JournalLog.h"
#include "platform/linux/log/LinuxLog.h"
#include "platform/linux/log/LogLine.h"
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
  for (const char* path : {"/dev/full", "/dev/null/zelkord.log"}) {
    FileLog log(path);
    log.write({}, LogLevel::Error, "C", "lost");
    log.flush();
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
