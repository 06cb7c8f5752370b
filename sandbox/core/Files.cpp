#include "sandbox/core/Files.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>

namespace sandbox {

namespace {

bool writeAll(int file, std::string_view content) {
  while (!content.empty()) {
    const ssize_t written = ::write(file, content.data(), content.size());
    if (written < 0 && errno == EINTR) continue;
    if (written < 0) return false;
    content.remove_prefix(static_cast<std::size_t>(written));
  }
  return true;
}

}  // namespace

std::optional<std::string> readFile(const std::filesystem::path& path) {
  const int file = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
  if (file < 0) return std::nullopt;
  std::string content;
  struct stat status {};
  if (::fstat(file, &status) == 0) content.reserve(static_cast<std::size_t>(status.st_size));
  char buffer[65536];
  ssize_t count = 0;
  while ((count = ::read(file, buffer, sizeof buffer)) > 0) {
    content.append(buffer, static_cast<std::size_t>(count));
  }
  ::close(file);
  if (count < 0) return std::nullopt;
  return content;
}

bool writeFileAtomically(const std::filesystem::path& path, std::string_view content, mode_t mode) {
  const std::string temporary = path.string() + "." + std::to_string(::getpid()) + ".new";
  ::unlink(temporary.c_str());
  const int file = ::open(temporary.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, mode);
  if (file < 0) return false;
  const bool written = writeAll(file, content) && ::fsync(file) == 0;
  ::close(file);
  if (written && ::rename(temporary.c_str(), path.c_str()) == 0) return true;
  ::unlink(temporary.c_str());
  return false;
}

}  // namespace sandbox
