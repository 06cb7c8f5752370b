#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <vector>

#include "platform/linux/LinuxPlatform.h"
#include "platform/linux/ipc/ConnectionBudgets.h"
#include "platform/linux/log/JournalLog.h"
#include "platform/linux/queues/LinuxWorkQueues.h"
#include "platform/linux/url/TransferLimits.h"
#include "platform/testing/TemporaryDirectory.h"

namespace zelkord {
namespace {

using testing::HasSubstr;

const std::string kDirectories[] = {"XDG_STATE_HOME/com.quenta.zelkord",
                                    "XDG_CACHE_HOME/com.quenta.zelkord",
                                    "XDG_RUNTIME_DIR/com.quenta.zelkord"};

class LinuxPlatformTest : public testing::Test {
 protected:
  LinuxPlatformTest() {
    options_.usesSessionBus = false;
    options_.logFile = root_ / "log";
    options_.environment.environment =
        [this](const std::string& name) -> std::optional<std::string> {
      if (name == "XDG_CONFIG_DIRS") return root_ / "etc";
      if (name.starts_with("XDG_")) return root_ / name;
      return std::nullopt;
    };
  }

  unsigned modeOf(const std::string& directory) const {
    struct stat status {};
    ::stat((root_ / directory).c_str(), &status);
    return status.st_mode & 07777;
  }

  const TemporaryDirectory root_;
  LinuxPlatformOptions options_;
  Error error_;
};

TEST_F(LinuxPlatformTest, ServicesKeepWhatTheyAreToldOverARestart) {
  root_.write("etc/com.quenta.zelkord/defaults.json", R"({"ZLKLogPrivateData": true})");
  root_.write("XDG_CONFIG_HOME/com.quenta.zelkord/device.json", R"({"country": "JP"})");
  {
    const auto host = LinuxPlatform::make(options_, &error_);
    ASSERT_TRUE(host) << error_.description();
    auto& platform = host->platform();
    EXPECT_EQ(platform.maps.countryCode(), "JP");
    platform.settings.set("key", "value");
    platform.counters.add("counter", 3);
    Logger(platform.log, "C").error("typed {}", priv("text"));
  }
  EXPECT_THAT(root_.read("log"), HasSubstr("Z error C typed text\n"));
  EXPECT_THAT(root_.read("XDG_RUNTIME_DIR/com.quenta.zelkord/metrics.prom"),
              HasSubstr("{key=\"counter\"} 3"));
  const auto host = LinuxPlatform::make(options_, &error_);
  ASSERT_TRUE(host);
  EXPECT_EQ(host->platform().settings.value("key"), json::value("value"));
  EXPECT_EQ(host->platform().counters.all().at("counter"), 3);
}

TEST_F(LinuxPlatformTest, TwoDoNotShareAStateDirectoryAndTheSecondTouchesNothing) {
  const auto first = LinuxPlatform::make(options_, &error_);
  ASSERT_TRUE(first);
  for (const auto& directory : kDirectories) {
    root_.write(directory + "/.unfinished.a1b2c3", "the first one is writing this");
    ::chmod((root_ / directory).c_str(), 0750);
  }
  EXPECT_EQ(LinuxPlatform::make(options_, &error_), nullptr);
  EXPECT_EQ(error_.code, EWOULDBLOCK);
  EXPECT_THAT(*error_.reason(), HasSubstr("already running"));
  for (const auto& directory : kDirectories) {
    EXPECT_TRUE(root_.has(directory + "/.unfinished.a1b2c3")) << directory;
    EXPECT_EQ(modeOf(directory), 0750u) << directory;
  }
}

TEST_F(LinuxPlatformTest, ClosesItsDirectoriesToOthersAndRemovesWhatACrashLeft) {
  for (const auto& directory : kDirectories) {
    root_.write(directory + "/.unfinished.a1b2c3", "half");
    ::chmod((root_ / directory).c_str(), 0755);
  }
  ASSERT_TRUE(LinuxPlatform::make(options_, &error_)) << error_.description();
  for (const auto& directory : kDirectories) {
    EXPECT_EQ(modeOf(directory), 0700u) << directory;
    EXPECT_FALSE(root_.has(directory + "/.unfinished.a1b2c3")) << directory;
    EXPECT_THAT(root_.read("log"),
                HasSubstr(root_ / directory + " was open to others (0755) and is closed to them"));
  }
}

TEST_F(LinuxPlatformTest, UsesNoDirectoryOfSomebodyElse) {
  if (::geteuid() != 0) GTEST_SKIP() << "only the superuser gives directories away";
  for (const auto& directory : kDirectories) {
    root_.write(directory + "/file", "somebody else's");
    ASSERT_EQ(::chown((root_ / directory).c_str(), 12345, 12345), 0);
    EXPECT_EQ(LinuxPlatform::make(options_, &error_), nullptr);
    EXPECT_EQ(error_.reason(), root_ / directory + " belongs to user 12345");
    ASSERT_EQ(::chown((root_ / directory).c_str(), 0, 0), 0);
  }
}

TEST_F(LinuxPlatformTest, OnlyALogFileThatWasAskedForMustBeOne) {
  ASSERT_EQ(::mkfifo((root_ / "pipe").c_str(), 0600), 0);
  options_.logFile = root_ / "pipe";
  EXPECT_EQ(LinuxPlatform::make(options_, &error_), nullptr);
  EXPECT_EQ(error_.reason(), root_ / "pipe is no regular file");

  options_.logFile.clear();
  root_.write(kDirectories[0] + "/zelkord.log/file", "");
  testing::internal::CaptureStderr();
  EXPECT_TRUE(LinuxPlatform::make(options_, &error_)) << error_.description();
  const auto said = testing::internal::GetCapturedStderr();
  const auto expected = "zelkord: no log: " + root_ / kDirectories[0] + "/zelkord.log";
  if (!JournalLog::isThere()) {
    EXPECT_THAT(said, HasSubstr(expected));
  }
}

TEST_F(LinuxPlatformTest, SaysWhyWhenThereIsNoPlaceForItsState) {
  root_.write("XDG_STATE_HOME", "a file");
  EXPECT_EQ(LinuxPlatform::make(options_, &error_), nullptr);
  EXPECT_THAT(*error_.reason(), HasSubstr("XDG_STATE_HOME/com.quenta.zelkord"));
}

TEST_F(LinuxPlatformTest, ARefusedWaitIsCountedAndNamed) {
  const auto host = LinuxPlatform::make(options_, &error_);
  ASSERT_TRUE(host) << error_.description();
  const auto gate = host->queues().makeSemaphore(0);
  std::vector<std::unique_ptr<SerialQueue>> waiters;
  for (unsigned i = 0; i <= WorkerPool::kMaximumWaiting; ++i) {
    waiters.push_back(host->queues().makeSerialQueue("waiter"));
    waiters.back()->async([&] { gate->wait(20s); });
  }
  const auto refused = [&] {
    return host->platform().counters.all()["com.quenta.zelkord.limit.waits"];
  };
  for (int i = 0; i < 20'000 && refused() == 0; ++i) ::usleep(1000);
  gate->signal(WorkerPool::kMaximumWaiting);
  waiters.clear();
  EXPECT_EQ(refused(), 1);
  EXPECT_THAT(root_.read("log"), HasSubstr("waits"));
}

TEST(DescriptorsTest, WhatDoorsAndTransfersMayTakeTogetherFits) {
  constexpr std::uint64_t kEverythingElse = 128;
  for (const std::uint64_t descriptors : {1024u, 4096u, 65'536u}) {
    const auto doors = ipc::ConnectionBudgets::sizeFor(descriptors);
    const auto transfers = TransferLimits::of(descriptors);
    const auto idle = 2 * static_cast<std::uint64_t>(transfers.idleConnections);
    EXPECT_LE(doors.connections + doors.unadmitted + transfers.transfers.inAll * 4 + idle +
                  kEverythingElse,
              descriptors);
  }
}

}  // namespace
}  // namespace zelkord
