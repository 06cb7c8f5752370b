#include "platform/linux/url_cache/BodyFiles.h"

#include <dirent.h>
#include <fcntl.h>
#include <fmt/format.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <charconv>
#include <memory>
#include <string_view>
#include <vector>

#include "platform/linux/queues/BlockingScope.h"

namespace zelkord {
namespace {

constexpr std::string_view kBodySuffix = ".body";

// False at an early end of the file, too.
bool readFully(int file, std::string& bytes) {
  for (std::size_t done = 0; done < bytes.size();) {
    const auto count = ::read(file, bytes.data() + done, bytes.size() - done);
    if (count < 0 && errno == EINTR) continue;
    if (count <= 0) return false;
    done += static_cast<std::size_t>(count);
  }
  return true;
}

std::string bodyFileName(std::int64_t id) { return fmt::format("{:016x}{}", id, kBodySuffix); }

std::optional<std::int64_t> idOfBodyFile(std::string_view name) {
  if (!name.ends_with(kBodySuffix)) return std::nullopt;
  name.remove_suffix(kBodySuffix.size());
  std::int64_t id = 0;
  const auto [end, error] = std::from_chars(name.data(), name.data() + name.size(), id, 16);
  if (error != std::errc() || bodyFileName(id) != std::string(name) + std::string(kBodySuffix)) {
    return 0;  // looks like one of ours, but is not
  }
  return id;
}

}  // namespace

Descriptor BodyFiles::_openFolder() const {
  return Descriptor(::open(folder_.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
}

std::optional<Error> BodyFiles::makeFolder() {
  if (::mkdir(folder_.c_str(), 0700) != 0 && errno != EEXIST) return posixError(errno);
  open_ = _openFolder();
  if (!open_ || ::fchmod(open_.get(), 0700) != 0) return posixError(errno);
  return std::nullopt;
}

std::optional<Error> BodyFiles::write(std::int64_t id, std::string_view bytes) {
  const BlockingScope blocking;
  const auto name = bodyFileName(id);
  constexpr int kFlags = O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC;
  Descriptor file(::openat(open_.get(), name.c_str(), kFlags, 0600));
  if (!file && errno == EEXIST && ::unlinkat(open_.get(), name.c_str(), 0) == 0) {
    file = Descriptor(::openat(open_.get(), name.c_str(), kFlags, 0600));
  }
  if (!file) return posixError(errno);
  if (writeFully(file.get(), bytes) && file.close()) return std::nullopt;
  const auto error = posixError(errno);
  remove(id);
  return error;
}

std::optional<Data> BodyFiles::read(std::int64_t id, std::uint64_t size) {
  const BlockingScope blocking;
  if (!open_) open_ = _openFolder();
  // O_NONBLOCK: a pipe that somebody put there must not wait for a writer.
  constexpr int kFlags = O_RDONLY | O_NOFOLLOW | O_CLOEXEC | O_NONBLOCK;
  const Descriptor file(::openat(open_.get(), bodyFileName(id).c_str(), kFlags));
  struct stat status {};
  if (!file || ::fstat(file.get(), &status) != 0 || !S_ISREG(status.st_mode)) return std::nullopt;
  if (status.st_size <= 0 || static_cast<std::uint64_t>(status.st_size) != size) return {};
  if (size > kMaximumSize) return std::nullopt;
  std::string bytes(size, '\0');
  if (!readFully(file.get(), bytes)) return std::nullopt;
  return Data(std::move(bytes));
}

void BodyFiles::remove(std::int64_t id) {
  const BlockingScope blocking;
  ::unlinkat(open_.get(), bodyFileName(id).c_str(), 0);
}

void BodyFiles::removeUnless(FunctionRef<bool(std::int64_t id)> isKnown) {
  const BlockingScope blocking;
  const auto folder = _openFolder();
  const std::unique_ptr<DIR, int (*)(DIR*)> listing(
      ::fdopendir(::fcntl(folder.get(), F_DUPFD_CLOEXEC, 0)), ::closedir);
  if (!listing) return;
  std::vector<std::string> orphans;
  while (const auto* file = ::readdir(listing.get())) {
    const auto id = idOfBodyFile(file->d_name);
    if (id && !isKnown(*id)) orphans.emplace_back(file->d_name);
  }
  for (const auto& name : orphans) ::unlinkat(::dirfd(listing.get()), name.c_str(), 0);
}

}  // namespace zelkord
