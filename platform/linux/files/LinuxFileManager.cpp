#include "platform/linux/files/LinuxFileManager.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstdlib>
#include <memory>

#include "platform/linux/files/LinuxFileHandle.h"
#include "platform/linux/queues/BlockingScope.h"
#include "platform/linux/system/Descriptor.h"

namespace zelkord {
namespace {

// A leading dot: no resource and no container has such a name.
constexpr std::string_view kUnfinishedPrefix = ".unfinished.";

std::optional<Error> lastPosixError() { return posixError(errno); }

std::string parentOf(const std::string& path) {
  const auto slash = path.rfind('/');
  return slash == 0 || slash == std::string::npos ? "/" : path.substr(0, slash);
}

// None, with errno set, for whatever is not a regular file.
Descriptor openRegularFile(const std::string& path) {
  // O_NONBLOCK: opening a pipe that somebody put there must not wait for a writer.
  Descriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
  struct stat status {};
  if (!file || ::fstat(file.get(), &status) != 0) return {};
  if (S_ISREG(status.st_mode)) return file;
  file = {};
  errno = S_ISDIR(status.st_mode) ? EISDIR : EINVAL;
  return {};
}

// Without this a crash may undo the rename.
std::optional<Error> syncDirectory(const std::string& path) {
  const Descriptor directory(::open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (!directory) return lastPosixError();
  // Some file systems cannot sync a directory; then the rename is as durable as it gets.
  if (::fsync(directory.get()) != 0 && errno != EINVAL && errno != EROFS) return lastPosixError();
  return std::nullopt;
}

std::optional<Error> fillFile(Descriptor file, std::string_view bytes, unsigned mode) {
  if (!writeFully(file.get(), bytes) || ::fchmod(file.get(), mode) != 0 ||
      ::fsync(file.get()) != 0 || !file.close()) {
    return lastPosixError();
  }
  return std::nullopt;
}

std::optional<Error> makeOneDirectory(const std::string& path) {
  if (::mkdir(path.c_str(), 0700) == 0) return std::nullopt;
  const int number = errno;
  struct stat status {};
  if (::stat(path.c_str(), &status) != 0) return posixError(number);
  return S_ISDIR(status.st_mode) ? std::nullopt : std::optional(posixError(ENOTDIR));
}

}  // namespace

std::optional<Error> LinuxFileManager::createDirectory(const std::string& path) {
  for (auto slash = path.find('/', 1); slash != std::string::npos;
       slash = path.find('/', slash + 1)) {
    if (auto error = makeOneDirectory(path.substr(0, slash))) return error;
  }
  return makeOneDirectory(path);
}

std::optional<std::string> LinuxFileManager::read(const std::string& path, std::uint64_t limit,
                                                  Error* error) {
  const auto failed = [error](int number) -> std::optional<std::string> {
    if (error) *error = posixError(number);
    return std::nullopt;
  };
  const BlockingScope blocking;
  const auto file = openRegularFile(path);
  std::string bytes;
  if (!file) return failed(errno);
  if (!readFully(file.get(), limit, bytes)) return failed(errno);
  return bytes;
}

std::unique_ptr<FileHandle> LinuxFileManager::openForReading(const std::string& path,
                                                             Error* error) {
  const BlockingScope blocking;
  auto file = openRegularFile(path);
  if (file) return std::make_unique<LinuxFileHandle>(std::move(file));
  if (error) *error = posixError(errno);
  return nullptr;
}

std::optional<Error> LinuxFileManager::writeAtomically(const std::string& path,
                                                       std::string_view bytes, unsigned mode) {
  const BlockingScope blocking;
  const auto directory = parentOf(path);
  auto unfinished = directory + "/" + std::string(kUnfinishedPrefix) + "XXXXXX";
  Descriptor file(::mkostemp(unfinished.data(), O_CLOEXEC));
  if (!file) return lastPosixError();
  auto error = fillFile(std::move(file), bytes, mode);
  if (!error && ::rename(unfinished.c_str(), path.c_str()) != 0) error = lastPosixError();
  if (error) {
    ::unlink(unfinished.c_str());
    return error;
  }
  return syncDirectory(directory);
}

std::optional<Error> LinuxFileManager::setPermissions(const std::string& path, unsigned mode) {
  return ::chmod(path.c_str(), mode) == 0 ? std::nullopt : lastPosixError();
}

std::optional<Error> LinuxFileManager::remove(const std::string& path) {
  const BlockingScope blocking;
  return ::unlink(path.c_str()) == 0 ? std::nullopt : lastPosixError();
}

void LinuxFileManager::removeLeftovers(const std::string& directory) {
  const std::unique_ptr<DIR, int (*)(DIR*)> listing(::opendir(directory.c_str()), ::closedir);
  if (!listing) return;
  while (const auto* entry = ::readdir(listing.get())) {
    if (!std::string_view(entry->d_name).starts_with(kUnfinishedPrefix)) continue;
    ::unlinkat(::dirfd(listing.get()), entry->d_name, 0);
  }
}

}  // namespace zelkord
