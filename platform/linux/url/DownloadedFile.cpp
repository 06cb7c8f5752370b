#include "platform/linux/url/DownloadedFile.h"

#include <sys/mman.h>

#include <cerrno>
#include <optional>
#include <utility>

namespace zelkord {
Descriptor moveBodyToFile(URLResult& result) {
  const auto body = std::exchange(result.data, std::nullopt);
  if (!body || result.error) return {};
  Descriptor file(::memfd_create("download", MFD_CLOEXEC));
  if (!file || !writeFully(file.get(), body->view())) {
    result.error = posixError(errno);
    return {};
  }
  result.file = URLResult::File{"/proc/self/fd/" + std::to_string(file.get()), body->size()};
  return file;
}

}  // namespace zelkord
