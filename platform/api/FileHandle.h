#pragma once

#include <optional>

#include "base/Data.h"
#include "base/Error.h"

namespace zelkord {

// A file that is open for reading. Threading: one thread at a time.
class FileHandle {
 public:
  virtual ~FileHandle() = default;
  // The whole file as it is now, mapped read-only and private; outlives the handle. None on
  // failure, of an empty file too: `error` is then the POSIX error.
  virtual std::optional<Data> map(Error* error) = 0;
};

}  // namespace zelkord
