#pragma once

#include "platform/api/FileManager.h"

namespace zelkord {

// Whole files on the disk.
//
// A write goes to a hidden file beside the target, is synced, then renamed over it; what a crash
// leaves of one is removed by `removeLeftovers`.
//
// Threading: any thread. Errors: POSIX errors.
class LinuxFileManager final : public FileManager {
 public:
  explicit LinuxFileManager(Directories directories) : directories_(std::move(directories)) {}

  const Directories& directories() const override { return directories_; }
  std::optional<Error> createDirectory(const std::string& path) override;
  // Regular files only.
  std::optional<std::string> read(const std::string& path, std::uint64_t limit,
                                  Error* error) override;
  std::unique_ptr<FileHandle> openForReading(const std::string& path, Error* error) override;
  std::optional<Error> writeAtomically(const std::string& path, std::string_view bytes,
                                       unsigned mode) override;
  std::optional<Error> setPermissions(const std::string& path, unsigned mode) override;
  std::optional<Error> remove(const std::string& path) override;

  // Removes unfinished writes from a directory. For the start, while nothing writes.
  static void removeLeftovers(const std::string& directory);

 private:
  const Directories directories_;
};

}  // namespace zelkord
