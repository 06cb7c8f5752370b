#include "platform/linux/files/LinuxContainerFiles.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>

#include "platform/linux/queues/BlockingScope.h"
#include "platform/linux/system/Descriptor.h"

namespace zelkord {
namespace {

class LinuxAppendFile final : public AppendFile {
 public:
  LinuxAppendFile(std::string path, Descriptor file, const struct stat& status)
      : path_(std::move(path)),
        file_(std::move(file)),
        device_(status.st_dev),
        number_(status.st_ino),
        length_(static_cast<std::uint64_t>(status.st_size)) {}

  std::uint64_t length() const override { return length_; }

  bool isIntact() const override {
    struct stat status {};
    return !broken_ && ::lstat(path_.c_str(), &status) == 0 && status.st_dev == device_ &&
           status.st_ino == number_ && static_cast<std::uint64_t>(status.st_size) == length_;
  }

  std::optional<Error> append(std::string_view bytes) override {
    if (broken_) return posixError(EIO);
    const BlockingScope blocking;
    if (writeFully(file_.get(), bytes)) {
      length_ += bytes.size();
      return std::nullopt;
    }
    auto error = posixError(errno);
    broken_ = ::ftruncate(file_.get(), static_cast<off_t>(length_)) != 0;
    return error;
  }

 private:
  const std::string path_;
  const Descriptor file_;
  const dev_t device_;
  const ino_t number_;
  std::uint64_t length_;
  bool broken_ = false;  // there may be half a record at the end
};

// A file may say any year; wallTimeOfSeconds keeps to those that a WallTime holds.
WallTime wallTimeOf(const statx_timestamp& stamp) {
  return wallTimeOfSeconds(static_cast<double>(stamp.tv_sec)) +
         std::chrono::nanoseconds(stamp.tv_nsec);
}

void setLastError(Error* error) {
  if (error) *error = posixError(errno);
}

// None, with errno set, for whatever is not a regular file.
Descriptor openToWrite(const std::string& path, struct stat& status) {
  Descriptor file(::open(path.c_str(), O_WRONLY | O_APPEND | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK));
  if (!file || ::fstat(file.get(), &status) != 0) return {};
  if (S_ISREG(status.st_mode)) return file;
  file = {};
  errno = EINVAL;
  return {};
}

}  // namespace

std::optional<std::vector<std::string>> LinuxContainerFiles::list(const std::string& directory,
                                                                  Error* error) {
  const BlockingScope blocking;
  const std::unique_ptr<DIR, int (*)(DIR*)> listing(::opendir(directory.c_str()), ::closedir);
  std::vector<std::string> names;
  if (listing) errno = 0;
  while (const auto* entry = listing ? ::readdir(listing.get()) : nullptr) {
    const std::string_view name = entry->d_name;
    if (name != "." && name != "..") names.emplace_back(name);
    errno = 0;
  }
  if (listing && errno == 0) return names;
  setLastError(error);
  return std::nullopt;
}

std::optional<FileAttributes> LinuxContainerFiles::attributes(const std::string& path,
                                                              Error* error) {
  struct statx status {};
  constexpr unsigned kWanted = STATX_TYPE | STATX_SIZE | STATX_MTIME | STATX_BTIME;
  if (::statx(AT_FDCWD, path.c_str(), AT_SYMLINK_NOFOLLOW, kWanted, &status) != 0) {
    setLastError(error);
    return std::nullopt;
  }
  auto created = wallTimeOf(status.stx_mtime);
  // Some file systems say zero for a birth that they do not know.
  if ((status.stx_mask & STATX_BTIME) && status.stx_btime.tv_sec > 0) {
    created = std::min(created, wallTimeOf(status.stx_btime));
  }
  return FileAttributes{status.stx_size, created, S_ISREG(status.stx_mode)};
}

std::optional<Error> LinuxContainerFiles::createExclusively(const std::string& path) {
  const BlockingScope blocking;
  constexpr int kFlags = O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC | O_NOFOLLOW;
  const Descriptor file(::open(path.c_str(), kFlags, 0600));
  return file ? std::nullopt : std::optional(posixError(errno));
}

std::unique_ptr<AppendFile> LinuxContainerFiles::openForAppending(const std::string& path,
                                                                  Error* error) {
  const BlockingScope blocking;
  struct stat status {};
  auto file = openToWrite(path, status);
  if (file) {
    return std::make_unique<LinuxAppendFile>(path, std::move(file), status);
  }
  setLastError(error);
  return nullptr;
}

std::optional<Error> LinuxContainerFiles::cut(const std::string& path, std::uint64_t length) {
  const BlockingScope blocking;
  struct stat status {};
  const auto file = openToWrite(path, status);
  const bool done = file && ::ftruncate(file.get(), static_cast<off_t>(length)) == 0;
  return done ? std::nullopt : std::optional(posixError(errno));
}

}  // namespace zelkord
