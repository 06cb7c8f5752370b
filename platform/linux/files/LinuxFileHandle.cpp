#include "platform/linux/files/LinuxFileHandle.h"

#include <fcntl.h>
#include <sys/mman.h>

#include <cerrno>
#include <memory>
#include <string>

namespace zelkord {
namespace {

constexpr int kUnchangeable = F_SEAL_SHRINK | F_SEAL_WRITE;

bool isUnchangeable(const Descriptor& file) {
  const int seals = ::fcntl(file.get(), F_GET_SEALS);
  return seals >= 0 && (seals & kUnchangeable) == kUnchangeable;
}

}  // namespace

std::optional<Data> LinuxFileHandle::map(std::uint64_t limit, Error* error) {
  const auto end = ::lseek(file_.get(), 0, SEEK_END);
  const auto size = static_cast<std::uint64_t>(end < 0 ? 0 : end);
  std::optional<Data> bytes;
  if (end >= 0 && size > limit) {
    errno = EFBIG;
  } else if (end >= 0) {
    bytes = isUnchangeable(file_) ? _mapping(size) : _copy(limit);
  }
  if (!bytes && error) *error = posixError(errno);
  return bytes;
}

std::optional<Data> LinuxFileHandle::_mapping(std::size_t size) const {
  void* const start = ::mmap(nullptr, size, PROT_READ, MAP_PRIVATE, file_.get(), 0);
  if (start == MAP_FAILED) return std::nullopt;
  std::shared_ptr<const void> mapping(start, [size](void* address) { ::munmap(address, size); });
  return Data(std::move(mapping), {static_cast<const char*>(start), size});
}

std::optional<Data> LinuxFileHandle::_copy(std::uint64_t limit) const {
  std::string bytes;
  if (::lseek(file_.get(), 0, SEEK_SET) < 0 || !readFully(file_.get(), limit, bytes)) {
    return std::nullopt;
  }
  if (!bytes.empty()) return Data(std::move(bytes));
  errno = EINVAL;
  return std::nullopt;
}

}  // namespace zelkord
