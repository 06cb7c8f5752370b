#include "zelkord/storage/mmapFileHandle.h"

namespace zelkord {

std::optional<Data> mmapFileHandle(FileHandle& handle, Error* error, std::uint64_t limit) {
  return handle.map(limit, error);
}

}  // namespace zelkord
