#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "base/Error.h"
#include "base/Time.h"

namespace zelkord {

// What is known of a file without opening it.
struct FileAttributes {
  std::uint64_t size = 0;
  // The earlier of its birth, where the file system keeps it, and its last change.
  WallTime created{};
  bool isRegular = false;  // a link is not
};

// A file that grows at its end; destroying it closes it. Failures are POSIX errors.
// Threading: one thread at a time.
class AppendFile {
 public:
  virtual ~AppendFile() = default;
  virtual std::uint64_t length() const = 0;
  // Whether it still stands at its path, with the length that it was left with: nobody else has
  // touched it, and no append has left half of something behind.
  virtual bool isIntact() const = 0;
  // All of the bytes or none: what was written of them is cut off again. Should even that fail,
  // nothing is appended any more.
  virtual std::optional<Error> append(std::string_view bytes) = 0;
};

// Files that are written from front to end while they are kept. Failures are POSIX errors.
// Threading: any thread; calls block for the file system.
class ContainerFiles {
 public:
  virtual ~ContainerFiles() = default;
  // The names in a directory, in no order. None on failure, `error` then set.
  virtual std::optional<std::vector<std::string>> list(const std::string& directory,
                                                       Error* error) = 0;
  // Links are not followed. None on failure, `error` then set.
  virtual std::optional<FileAttributes> attributes(const std::string& path, Error* error) = 0;
  // Makes an empty file, 0600. EEXIST when anything has the name.
  virtual std::optional<Error> createExclusively(const std::string& path) = 0;
  // Null on failure, `error` then set. Regular files that exist only, and no links.
  virtual std::unique_ptr<AppendFile> openForAppending(const std::string& path, Error* error) = 0;
  // Cuts a regular file back to `length` bytes.
  virtual std::optional<Error> cut(const std::string& path, std::uint64_t length) = 0;
};

}  // namespace zelkord
