#pragma once

#include <cstdint>
#include <optional>

#include "platform/api/FileHandle.h"

namespace zelkord {

// The bytes of the whole open file, read-only and private; they outlive the handle. None on
// failure, of an empty file or one of more than `limit` bytes too: `error`, when asked for, is then
// the POSIX error.
inline std::optional<Data> mmapFileHandle(FileHandle& handle, Error* error,
                                          std::uint64_t limit = UINT64_MAX) {
  return handle.map(limit, error);
}

}  // namespace zelkord
