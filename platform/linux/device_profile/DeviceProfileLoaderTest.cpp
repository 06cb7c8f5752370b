#include <gmock/gmock.h>

#include <condition_variable>
#include <mutex>

#include "platform/linux/device_profile/DeviceProfileLoader.h"
#include "platform/linux/files/LinuxFileManager.h"
#include "platform/linux/loop/Loop.h"
#include "platform/linux/queues/LinuxWorkQueues.h"
#include "platform/testing/FakeFileManager.h"
#include "platform/testing/ManualTimeline.h"
#include "platform/testing/RecordingLog.h"
#include "platform/testing/TemporaryDirectory.h"

namespace zelkord {
namespace {

class DeviceProfileLoaderTest : public testing::Test {
 protected:
  DeviceProfileLoaderTest() {
    for (const auto name : {kCountryCodeChanged, kTimeZoneChanged, kCurrentLocaleChanged}) {
      observers_.push_back(center_.observe(std::string(name), [this](const Notification& posted) {
        posted_.push_back(posted.name);
      }));
    }
  }

  FakeFileManager files_;
  ManualTimeline timeline_;
  RecordingLog log_;
  NotificationCenter center_;
  DeviceProfileStore store_{center_, "en_US"};
  std::vector<Subscription> observers_;
  std::vector<std::string> posted_;
};

TEST_F(DeviceProfileLoaderTest, TakesTheFirstFileThatExists) {
  files_.put("/c/device.json", R"({"country": "FR"})");
  files_.put("/b/device.json", R"({"country": "DE"})");
  DeviceProfileLoader loader({"/a/device.json", "/b/device.json", "/c/device.json"}, store_, files_,
                             timeline_, nullptr, log_);
  EXPECT_EQ(store_.current()->country, "DE");

  files_.put("/a/device.json", R"({"country": "IT"})");
  loader.noteChange();
  timeline_.advance(1s);
  EXPECT_EQ(store_.current()->country, "IT");
  files_.remove("/a/device.json");
  files_.remove("/b/device.json");
  loader.noteChange();
  timeline_.advance(1s);
  EXPECT_EQ(store_.current()->country, "FR");
}

TEST_F(DeviceProfileLoaderTest, ReadsABurstOnceAndSoonEvenWhenItGoesOn) {
  DeviceProfileLoader loader({"/a/device.json"}, store_, files_, timeline_, nullptr, log_);
  files_.put("/a/device.json", R"({"country": "DE", "time_zone": "Asia/Tokyo"})");
  for (int i = 0; i < 12; ++i) {
    loader.noteChange();
    timeline_.advance(50ms);
  }
  EXPECT_THAT(posted_, testing::ElementsAre(kCountryCodeChanged, kTimeZoneChanged));
}

TEST_F(DeviceProfileLoaderTest, ComplainsOnceAboutAValue) {
  files_.put("/a/device.json", R"({"country": 1})");
  DeviceProfileLoader loader({"/a/device.json"}, store_, files_, timeline_, nullptr, log_);
  for (const char* text :
       {R"({"country": 2, "locale": "de_DE"})", R"({"country": 1, "locale": 1})"}) {
    files_.put("/a/device.json", text);
    loader.noteChange();
    timeline_.advance(1s);
  }
  EXPECT_EQ(log_.count("\"country\""), 1);
  EXPECT_EQ(log_.count("\"locale\""), 1);
}

TEST_F(DeviceProfileLoaderTest, AFileThatCannotBeReadIsAnEmptyProfileNotTheNextFile) {
  files_.put("/a/device.json", "{}");
  files_.put("/b/device.json", R"({"country": "DE"})");
  files_.fail(FakeFileManager::Operation::Read, EACCES);
  DeviceProfileLoader loader({"/a/device.json", "/b/device.json"}, store_, files_, timeline_,
                             nullptr, log_);
  EXPECT_EQ(*store_.current(), DeviceProfile());
  EXPECT_EQ(log_.count(LogLevel::Error), 1);
}

// The profile as it appears to the rest of the daemon, with real files, queues and inotify.
class WatchedProfileTest : public testing::Test {
 protected:
  WatchedProfileTest() {
    observer_ = store_.observe([this](const DeviceProfile&, const DeviceProfile& after) {
      const std::lock_guard lock(mutex_);
      country_ = after.country.value_or("none");
      changed_.notify_all();
    });
  }
  bool becomes(const std::string& country) {
    std::unique_lock lock(mutex_);
    return changed_.wait_for(lock, 20s, [&] { return country_ == country; });
  }

  const TemporaryDirectory root_;
  LinuxFileManager files_{{root_.path(), root_.path(), root_.path()}};
  const LinuxClock clock_;
  LinuxWorkQueues queues_{clock_, 2};
  RecordingLog log_;
  NotificationCenter center_;
  DeviceProfileStore store_{center_, "en_US"};
  Subscription observer_;
  std::mutex mutex_;
  std::condition_variable changed_;
  std::string country_;
};

TEST_F(WatchedProfileTest, SeesEveryWayInWhichAFileChanges) {
  Loop host("test-host");
  PathWatcher watcher(host, log_);
  DeviceProfileLoader loader({root_ / "config/zelkord/device.json"}, store_, files_, queues_,
                             &watcher, log_);
  root_.write("config/zelkord/device.json", R"({"country": "AA"})");
  EXPECT_TRUE(becomes("AA")) << "made with its directories";
  root_.write("config/zelkord/device.json", R"({"country": "BB"})");
  EXPECT_TRUE(becomes("BB")) << "written in place";
  root_.write("config/zelkord/other", R"({"country": "CC"})");
  std::filesystem::rename(root_ / "config/zelkord/other", root_ / "config/zelkord/device.json");
  EXPECT_TRUE(becomes("CC")) << "replaced";
  std::filesystem::remove(root_ / "config/zelkord/device.json");
  EXPECT_TRUE(becomes("none")) << "removed";
  root_.write("elsewhere/real.json", R"({"country": "DD"})");
  std::filesystem::create_symlink(root_ / "elsewhere/real.json",
                                  root_ / "config/zelkord/device.json");
  EXPECT_TRUE(becomes("DD")) << "linked";
  root_.write("elsewhere/real.json", R"({"country": "EE"})");
  EXPECT_TRUE(becomes("EE")) << "written behind the link";
  std::filesystem::rename(root_ / "config", root_ / "away");
  EXPECT_TRUE(becomes("none")) << "directory moved away";
  std::filesystem::rename(root_ / "away", root_ / "config");
  EXPECT_TRUE(becomes("EE")) << "directory moved back";
}

}  // namespace
}  // namespace zelkord
