#pragma once

#include <optional>

#include "platform/api/FileHandle.h"

namespace zelkord {

// The bytes of the whole open file, mapped read-only and private; they outlive the handle. None on
// failure, of an empty file too: `error`, when asked for, is then the POSIX error.
std::optional<Data> mmapFileHandle(FileHandle& handle, Error* error);

}  // namespace zelkord
