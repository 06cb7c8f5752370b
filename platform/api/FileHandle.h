#pragma once

#include <cstdint>
#include <optional>

#include "base/Data.h"
#include "base/Error.h"

namespace zelkord {

// A file that is open for reading. Threading: one thread at a time.
class FileHandle {
 public:
  virtual ~FileHandle() = default;
  // The whole file as it is now, read-only and private; whatever becomes of the file changes
  // nothing of it, and it outlives the handle. None on failure, of an empty file or one of more
  // than `limit` bytes too: `error` is then the POSIX error.
  virtual std::optional<Data> map(std::uint64_t limit, Error* error) = 0;
};

}  // namespace zelkord
