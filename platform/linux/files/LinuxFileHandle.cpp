#include "platform/linux/files/LinuxFileHandle.h"

#include <sys/mman.h>

#include <cerrno>
#include <memory>

namespace zelkord {

std::optional<Data> LinuxFileHandle::map(Error* error) {
  const auto end = ::lseek(file_.get(), 0, SEEK_END);
  const auto size = static_cast<std::size_t>(end < 0 ? 0 : end);
  void* const start =
      end < 0 ? MAP_FAILED : ::mmap(nullptr, size, PROT_READ, MAP_PRIVATE, file_.get(), 0);
  if (start == MAP_FAILED) {
    if (error) *error = posixError(errno);
    return std::nullopt;
  }
  std::shared_ptr<const void> mapping(start, [size](void* address) { ::munmap(address, size); });
  return Data(std::move(mapping), {static_cast<const char*>(start), size});
}

}  // namespace zelkord
