#include "platform/linux/files/OwnDirectory.h"

#include <fcntl.h>
#include <fmt/format.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstring>

#include "platform/linux/system/Descriptor.h"

namespace zelkord {
namespace {

constexpr mode_t kOthers = 0077;

}  // namespace

std::optional<Error> foreignDirectory(const std::string& path) {
  struct stat status {};
  if (::stat(path.c_str(), &status) != 0 || status.st_uid == ::geteuid()) return std::nullopt;
  auto error = posixError(EPERM);
  error.userInfo["reason"] = fmt::format("{} belongs to user {}", path, status.st_uid);
  return error;
}

std::optional<std::string> closeToOthers(const std::string& path) {
  const Descriptor directory(::open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  struct stat status {};
  if (!directory || ::fstat(directory.get(), &status) != 0) return std::nullopt;
  const mode_t mode = status.st_mode & 07777;
  if ((mode & kOthers) == 0) return std::nullopt;
  if (::fchmod(directory.get(), mode & ~kOthers) == 0) {
    return fmt::format("{} was open to others ({:04o}) and is closed to them now", path, mode);
  }
  return fmt::format("{} is open to others ({:04o}): {}", path, mode, std::strerror(errno));
}

}  // namespace zelkord
