#include "platform/linux/files/StateLock.h"

#include <fcntl.h>
#include <sys/file.h>

#include <cerrno>

namespace zelkord {
namespace {

// The file holds the process number of its holder, for people.
std::string lockHolder(int file) {
  char text[32] = {};
  const auto count = ::pread(file, text, sizeof text - 1, 0);
  std::string holder(text, count > 0 ? static_cast<std::size_t>(count) : 0);
  while (!holder.empty() && holder.back() == '\n') holder.pop_back();
  return holder.find_first_not_of("0123456789") == std::string::npos ? holder : std::string();
}

Error alreadyRunning(int file, const std::string& directory) {
  auto error = posixError(EWOULDBLOCK);
  const auto holder = lockHolder(file);
  error.userInfo["reason"] =
      "already running: " + (holder.empty() ? "another process" : "process " + holder) + " uses " +
      directory;
  return error;
}

}  // namespace

std::optional<StateLock> StateLock::acquire(const std::string& directory, Error* error) {
  const auto path = directory + "/lock";
  Descriptor file(::open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0600));
  if (!file) {
    if (error) *error = posixError(errno);
    return std::nullopt;
  }
  if (::flock(file.get(), LOCK_EX | LOCK_NB) != 0) {
    if (error)
      *error = errno == EWOULDBLOCK ? alreadyRunning(file.get(), directory) : posixError(errno);
    return std::nullopt;
  }
  const auto number = std::to_string(::getpid()) + "\n";
  // Only a help for people: the lock itself does not depend on it.
  if (::ftruncate(file.get(), 0) != 0 || ::pwrite(file.get(), number.data(), number.size(), 0) < 0)
    errno = 0;
  return StateLock(std::move(file));
}

}  // namespace zelkord
