#include <fcntl.h>
#include <gmock/gmock.h>
#include <signal.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <filesystem>
#include <functional>
#include <string>

#include "platform/linux/files/LinuxContainerFiles.h"
#include "platform/linux/files/LinuxFileManager.h"
#include "platform/linux/queues/LinuxWorkQueues.h"
#include "platform/linux/url_cache/BodyFiles.h"
#include "platform/testing/FakeFileManager.h"
#include "platform/testing/ForkedProcess.h"
#include "platform/testing/TemporaryDirectory.h"

namespace zelkord {
namespace {

using testing::UnorderedElementsAre;

// What the fake promises, the disk keeps.
class ContainerFilesContractTest : public testing::TestWithParam<bool> {
 protected:
  ContainerFilesContractTest() {
    const Directories directories{root_.path(), root_.path(), root_.path()};
    fake_ = std::make_unique<FakeFileManager>(directories);
    fake_->putDirectory(root_ / "folder");
    std::filesystem::create_directory(root_ / "folder");
  }
  ContainerFiles& files() { return GetParam() ? static_cast<ContainerFiles&>(real_) : *fake_; }
  void remove(const std::string& path) {
    if (GetParam()) std::filesystem::remove(path);
    fake_->remove(path);
  }
  std::uint64_t sizeOf(const std::string& path) { return files().attributes(path, nullptr)->size; }

  const TemporaryDirectory root_;
  LinuxContainerFiles real_;
  std::unique_ptr<FakeFileManager> fake_;
};

TEST_P(ContainerFilesContractTest, GrowsAndCutsAFile) {
  const auto path = root_ / "file";
  ASSERT_EQ(files().createExclusively(path), std::nullopt);
  EXPECT_EQ(files().createExclusively(path)->code, EEXIST);
  EXPECT_EQ(files().createExclusively(root_ / "folder")->code, EEXIST);

  const auto file = files().openForAppending(path, nullptr);
  ASSERT_TRUE(file);
  EXPECT_EQ(file->append("first"), std::nullopt);
  EXPECT_EQ(file->append(" second"), std::nullopt);
  EXPECT_EQ(file->length(), 12u);
  EXPECT_EQ(files().openForAppending(path, nullptr)->length(), 12u);
  EXPECT_TRUE(file->isIntact());

  EXPECT_EQ(files().cut(path, 5), std::nullopt);
  EXPECT_EQ(sizeOf(path), 5u);
  EXPECT_FALSE(file->isIntact());
  EXPECT_THAT(*files().list(root_.path(), nullptr), UnorderedElementsAre("file", "folder"));
}

TEST_P(ContainerFilesContractTest, AFileThatOthersTouchedIsNotIntact) {
  const auto path = root_ / "file";
  ASSERT_EQ(files().createExclusively(path), std::nullopt);
  const auto file = files().openForAppending(path, nullptr);
  EXPECT_TRUE(file->isIntact());
  EXPECT_EQ(files().openForAppending(path, nullptr)->append("of others"), std::nullopt);
  EXPECT_FALSE(file->isIntact());

  const auto removed = files().openForAppending(path, nullptr);
  EXPECT_TRUE(removed->isIntact());
  remove(path);
  EXPECT_FALSE(removed->isIntact());
  ASSERT_EQ(files().createExclusively(path), std::nullopt);
  EXPECT_FALSE(removed->isIntact()) << "another file, of another length";
}

TEST_P(ContainerFilesContractTest, TellsWhatIsThere) {
  EXPECT_FALSE(files().attributes(root_ / "folder", nullptr)->isRegular);
  ASSERT_EQ(files().createExclusively(root_ / "file"), std::nullopt);
  EXPECT_TRUE(files().attributes(root_ / "file", nullptr)->isRegular);

  Error error;
  EXPECT_FALSE(files().attributes(root_ / "missing", &error));
  EXPECT_EQ(error.code, ENOENT);
  EXPECT_FALSE(files().list(root_ / "missing", &error));
  EXPECT_EQ(error.code, ENOENT);
  EXPECT_FALSE(files().openForAppending(root_ / "missing", &error));
  EXPECT_EQ(error.code, ENOENT);
  EXPECT_FALSE(files().openForAppending(root_ / "folder", &error));
  EXPECT_EQ(error.code, EISDIR);
  EXPECT_EQ(files().createExclusively(root_ / "missing/file")->code, ENOENT);
  EXPECT_EQ(files().cut(root_ / "missing", 0)->code, ENOENT);
}

INSTANTIATE_TEST_SUITE_P(FakeAndReal, ContainerFilesContractTest, testing::Bool());

class LinuxContainerFilesTest : public testing::Test {
 protected:
  // With the file size limited, as on a disk that is full.
  bool appendsWithin(rlim_t size, FunctionRef<bool(AppendFile&)> body) {
    return succeedsInChild([&] {
      ::signal(SIGXFSZ, SIG_IGN);
      const rlimit limit{size, size};
      ::setrlimit(RLIMIT_FSIZE, &limit);
      const auto file = files_.openForAppending(path_, nullptr);
      return file && body(*file);
    });
  }

  const TemporaryDirectory root_;
  const std::string path_ = root_ / "file";
  LinuxContainerFiles files_;
};

TEST_F(LinuxContainerFilesTest, LeavesNothingOfWhatDoesNotFit) {
  ASSERT_EQ(files_.createExclusively(path_), std::nullopt);
  EXPECT_TRUE(appendsWithin(1000, [](AppendFile& file) {
    if (file.append(std::string(600, 'a'))) return false;
    const auto error = file.append(std::string(600, 'b'));
    return error && error->code == EFBIG && file.length() == 600 &&
           !file.append(std::string(400, 'c'));
  }));
  EXPECT_EQ(root_.read("file"), std::string(600, 'a') + std::string(400, 'c'));
}

TEST_F(LinuxContainerFilesTest, FollowsNoLinks) {
  root_.write("other", "text");
  ASSERT_EQ(::symlink((root_ / "other").c_str(), path_.c_str()), 0);
  EXPECT_FALSE(files_.attributes(path_, nullptr)->isRegular);
  EXPECT_FALSE(files_.openForAppending(path_, nullptr));
  EXPECT_NE(files_.cut(path_, 0), std::nullopt);
  EXPECT_EQ(files_.createExclusively(path_)->code, EEXIST);
  EXPECT_EQ(root_.read("other"), "text");
}

TEST_F(LinuxContainerFilesTest, MakesFilesForTheirOwnerAlone) {
  const auto old = ::umask(0);
  EXPECT_EQ(files_.createExclusively(path_), std::nullopt);
  ::umask(old);
  struct stat status {};
  ASSERT_EQ(::stat(path_.c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 07777, 0600u);
}

TEST_F(LinuxContainerFilesTest, TakesTheEarlierOfBirthAndChange) {
  ASSERT_EQ(files_.createExclusively(path_), std::nullopt);
  const auto change = [&](time_t seconds) {
    const timespec times[] = {{seconds, 0}, {seconds, 0}};
    EXPECT_EQ(::utimensat(AT_FDCWD, path_.c_str(), times, 0), 0);
    return secondsSince1970(files_.attributes(path_, nullptr)->created);
  };
  EXPECT_EQ(change(1'000'000'000), 1e9);
  struct statx status {};
  ASSERT_EQ(::statx(AT_FDCWD, path_.c_str(), 0, STATX_BTIME, &status), 0);
  const bool knowsBirth = (status.stx_mask & STATX_BTIME) && status.stx_btime.tv_sec > 0;
  const auto birth = static_cast<double>(status.stx_btime.tv_sec);
  EXPECT_NEAR(change(5'000'000'000), knowsBirth ? birth : 5e9, 1);
}

TEST(DiskWaitsTest, WhoeverWaitsForADiskLeavesTheWorkersToOthers) {
  const TemporaryDirectory root;
  LinuxFileManager files({root.path(), root.path(), root.path()});
  LinuxContainerFiles containers;
  BodyFiles bodies(root / "bodies");
  ASSERT_FALSE(bodies.makeFolder());
  const std::string body(1 << 16, 'b');
  ASSERT_FALSE(bodies.write(1, body));
  ASSERT_FALSE(containers.createExclusively(root / "file"));
  const struct {
    const char* name;
    std::function<void()> operation;
  } kCases[] = {
      {"read", [&] { files.read(root / "file", 1, nullptr); }},
      {"openForReading", [&] { files.openForReading(root / "file", nullptr); }},
      {"remove", [&] { files.remove(root / "none"); }},
      {"list", [&] { containers.list(root.path(), nullptr); }},
      {"createExclusively", [&] { containers.createExclusively(root / "file"); }},
      {"openForAppending", [&] { containers.openForAppending(root / "file", nullptr); }},
      {"cut", [&] { containers.cut(root / "file", 0); }},
      {"bodies: write", [&] { bodies.write(2, body); }},
      {"bodies: read", [&] { bodies.read(1, body.size()); }},
      {"bodies: remove", [&] { bodies.remove(3); }},
      {"bodies: removeUnless", [&] { bodies.removeUnless([](auto) { return true; }); }},
  };
  const LinuxClock clock;
  LinuxWorkQueues queues(clock, 2);
  for (const auto& [name, operation] : kCases) {
    std::atomic<bool> seen = false;
    const auto deadline = clock.realNow() + 10s;
    const auto queue = queues.makeSerialQueue("disk");
    queue->async([&, &work = operation] {
      while (!seen && clock.realNow() < deadline) work();
    });
    while (!seen && clock.realNow() < deadline) seen = queues.workers().blocked > 0;
    queue->sync([] {});
    EXPECT_TRUE(seen) << name;
  }
}

}  // namespace
}  // namespace zelkord
