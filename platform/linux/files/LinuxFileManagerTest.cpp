#include <gmock/gmock.h>
#include <signal.h>
#include <sys/resource.h>
#include <sys/stat.h>

#include <cerrno>
#include <functional>

#include "platform/linux/files/LinuxFileManager.h"
#include "platform/testing/FakeFileManager.h"
#include "platform/testing/ForkedProcess.h"
#include "platform/testing/TemporaryDirectory.h"

namespace zelkord {
namespace {

using testing::ElementsAre;

std::vector<std::string> fileNamesIn(const std::string& directory) {
  std::vector<std::string> names;
  for (const auto& entry : std::filesystem::directory_iterator(directory)) {
    names.push_back(entry.path().filename());
  }
  return names;
}

std::optional<Error> readError(FileManager& files, const std::string& path, std::uint64_t limit) {
  Error error;
  return files.read(path, limit, &error) ? std::nullopt : std::optional(error);
}

// What the fake promises, the disk keeps.
class FileManagerContractTest : public testing::TestWithParam<bool> {
 protected:
  FileManagerContractTest() {
    const Directories directories{root_.path(), root_.path(), root_.path()};
    if (GetParam()) {
      files_ = std::make_unique<LinuxFileManager>(directories);
    } else {
      files_ = std::make_unique<FakeFileManager>(directories);
    }
  }

  const TemporaryDirectory root_;
  std::unique_ptr<FileManager> files_;
};

TEST_P(FileManagerContractTest, KeepsWholeFiles) {
  const auto path = root_ / "file";
  EXPECT_EQ(readError(*files_, path, 10)->code, ENOENT);
  EXPECT_EQ(files_->writeAtomically(path, "first and long", 0600), std::nullopt);
  EXPECT_EQ(files_->writeAtomically(path, std::string_view("se\0d", 4), 0600), std::nullopt);
  EXPECT_EQ(files_->read(path, 4, nullptr), std::string("se\0d", 4));
  EXPECT_EQ(readError(*files_, path, 3)->code, EFBIG);
  EXPECT_EQ(files_->remove(path), std::nullopt);
  EXPECT_EQ(files_->remove(path)->code, ENOENT);
}

TEST_P(FileManagerContractTest, RefusesPlacesThatDoNotFit) {
  EXPECT_EQ(files_->writeAtomically(root_ / "missing/file", "x", 0600)->code, ENOENT);
  EXPECT_EQ(readError(*files_, root_.path(), 10)->code, EISDIR);
  EXPECT_EQ(files_->writeAtomically(root_.path() + "/a", "x", 0600), std::nullopt);
  EXPECT_NE(files_->createDirectory(root_ / "a"), std::nullopt);
  EXPECT_EQ(files_->setPermissions(root_ / "b", 0600)->code, ENOENT);
  EXPECT_EQ(files_->createDirectory(root_ / "new/deep"), std::nullopt);
  EXPECT_EQ(files_->createDirectory(root_ / "new/deep"), std::nullopt);
  EXPECT_EQ(files_->writeAtomically(root_ / "new/deep/file", "x", 0600), std::nullopt);
}

INSTANTIATE_TEST_SUITE_P(FakeAndReal, FileManagerContractTest, testing::Bool());

class LinuxFileManagerTest : public testing::Test {
 protected:
  const TemporaryDirectory root_;
  LinuxFileManager files_{{root_.path(), root_.path(), root_.path()}};
};

TEST_F(LinuxFileManagerTest, GivesModesWhateverTheUmask) {
  const auto old = ::umask(0);
  EXPECT_EQ(files_.createDirectory(root_ / "a/b"), std::nullopt);
  EXPECT_EQ(files_.writeAtomically(root_ / "a/b/file", "x", 0640), std::nullopt);
  ::umask(old);
  const auto modeOf = [&](const char* name) {
    struct stat status {};
    ::stat((root_ / name).c_str(), &status);
    return status.st_mode & 07777;
  };
  EXPECT_EQ(modeOf("a"), 0700u);
  EXPECT_EQ(modeOf("a/b"), 0700u);
  EXPECT_EQ(modeOf("a/b/file"), 0640u);
}

TEST_F(LinuxFileManagerTest, KeepsTheOldFileWhenTheDiskIsFull) {
  const auto path = root_ / "file";
  files_.writeAtomically(path, "old", 0600);
  EXPECT_TRUE(succeedsInChild([&] {
    ::signal(SIGXFSZ, SIG_IGN);
    const rlimit limit{1000, 1000};
    ::setrlimit(RLIMIT_FSIZE, &limit);
    const auto error = files_.writeAtomically(path, std::string(5000, 'x'), 0600);
    return error && error->code == EFBIG;
  }));
  EXPECT_EQ(root_.read("file"), "old");
  EXPECT_THAT(fileNamesIn(root_.path()), ElementsAre("file"));
}

TEST_F(LinuxFileManagerTest, TellsWhatPermissionsForbid) {
  root_.write("closed/file", "secret");
  ::chmod((root_ / "closed").c_str(), 0755);
  ::chmod((root_ / "closed/file").c_str(), 0600);
  ::chmod(root_.path().c_str(), 0755);
  EXPECT_TRUE(succeedsInChild([&] {
    if (!dropPrivileges()) return false;
    const auto unreadable = readError(files_, root_ / "closed/file", 100);
    const auto readOnly = files_.writeAtomically(root_ / "closed/file", "x", 0600);
    return unreadable && unreadable->code == EACCES && readOnly && readOnly->code == EACCES;
  }));
  EXPECT_EQ(root_.read("closed/file"), "secret");
}

TEST_F(LinuxFileManagerTest, DoesNotWaitForWhoeverFillsAPipe) {
  ASSERT_EQ(::mkfifo((root_ / "pipe").c_str(), 0600), 0);
  EXPECT_EQ(readError(files_, root_ / "pipe", 10)->code, EINVAL);
}

TEST_F(LinuxFileManagerTest, WhatWasReadStaysWhenTheFileIsCut) {
  const std::string bytes(300'000, 'x');
  root_.write("file", bytes);
  const auto handle = files_.openForReading(root_ / "file", nullptr);
  ASSERT_TRUE(handle);
  const auto data = handle->map(bytes.size(), nullptr);
  ASSERT_EQ(::truncate((root_ / "file").c_str(), 0), 0);
  ASSERT_TRUE(data);
  EXPECT_EQ(data->view(), bytes);
  Error error;
  EXPECT_FALSE(handle->map(1, &error));
  EXPECT_EQ(error.code, EINVAL);
  root_.write("file", "xy");
  EXPECT_FALSE(handle->map(1, &error));
  EXPECT_EQ(error.code, EFBIG);
}

TEST_F(LinuxFileManagerTest, RemovesWhatACrashLeft) {
  root_.write(".unfinished.a1b2c3", "half");
  root_.write("bag.plist", "whole");
  LinuxFileManager::removeLeftovers(root_.path());
  EXPECT_THAT(fileNamesIn(root_.path()), ElementsAre("bag.plist"));
}

}  // namespace
}  // namespace zelkord
