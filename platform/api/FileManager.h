#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "base/Data.h"
#include "base/Error.h"
#include "platform/api/FileHandle.h"

namespace zelkord {

// Absolute paths of the daemon's own directories, without a slash at the end. They may not exist
// yet.
struct Directories {
  std::string caches;   // "bag.plist", containers, resources
  std::string state;    // settings, counters, transfers
  std::string runtime;  // sockets, metrics
};

// Whole-file operations. Failures are POSIX errors.
// Threading: any thread; calls block for the file system.
class FileManager {
 public:
  virtual ~FileManager() = default;
  virtual const Directories& directories() const = 0;
  // Makes the directory and its missing parents, each 0700.
  virtual std::optional<Error> createDirectory(const std::string& path) = 0;
  // None on failure, `error` then set. More than `limit` bytes fail with EFBIG.
  virtual std::optional<std::string> read(const std::string& path, std::uint64_t limit,
                                          Error* error) = 0;
  // Null on failure, `error` then set. Regular files only.
  virtual std::unique_ptr<FileHandle> openForReading(const std::string& path, Error* error) = 0;
  // Either the whole new content with `mode` or the old file: written beside it, synced, renamed.
  virtual std::optional<Error> writeAtomically(const std::string& path, std::string_view bytes,
                                               unsigned mode) = 0;
  virtual std::optional<Error> setPermissions(const std::string& path, unsigned mode) = 0;
  virtual std::optional<Error> remove(const std::string& path) = 0;
};

}  // namespace zelkord
