#pragma once

#include <map>
#include <set>
#include <string>

#include "base/Mutex.h"
#include "platform/api/FileManager.h"

namespace zelkord {

// Files in memory, under directories that can be told to fail.
//
// The directories are "/caches", "/state" and "/runtime" unless given; a test of a component that
// opens files by itself gives real ones. Like on a disk, a file needs its directory.
//
// Threading: any thread.
class FakeFileManager final : public FileManager {
 public:
  enum class Operation { CreateDirectory, Read, Open, Map, Write, SetPermissions, Remove };

  FakeFileManager();
  explicit FakeFileManager(Directories directories);

  const Directories& directories() const override { return directories_; }
  std::optional<Error> createDirectory(const std::string& path) override;
  std::optional<std::string> read(const std::string& path, std::uint64_t limit,
                                  Error* error) override;
  // The handle is the content as it was.
  std::unique_ptr<FileHandle> openForReading(const std::string& path, Error* error) override;
  std::optional<Error> writeAtomically(const std::string& path, std::string_view bytes,
                                       unsigned mode) override;
  std::optional<Error> setPermissions(const std::string& path, unsigned mode) override;
  std::optional<Error> remove(const std::string& path) override;

  // Failure injection: every call of that operation fails with `number` (ENOSPC, EACCES, ...); zero
  // ends it.
  void fail(Operation operation, int number);
  // What a write that others made without care leaves after a power cut: the first `size` bytes.
  void tear(const std::string& path, std::size_t size);

  // The disk as the test sees it; no failure applies. `put` makes the directory too.
  void put(const std::string& path, std::string bytes, unsigned mode = 0600);
  std::optional<std::string> bytes(const std::string& path) const;
  std::optional<unsigned> mode(const std::string& path) const;
  std::vector<std::string> paths() const;
  // How many writes succeeded.
  int writes() const;

 private:
  struct File {
    std::string bytes;
    unsigned mode = 0600;
  };

  std::optional<Error> injected(Operation operation) const ZK_REQUIRES(mutex_);
  void addDirectories(const std::string& path) ZK_REQUIRES(mutex_);

  const Directories directories_;
  mutable Mutex mutex_;
  std::map<std::string, File> files_ ZK_GUARDED_BY(mutex_);
  std::set<std::string> folders_ ZK_GUARDED_BY(mutex_);
  std::map<Operation, int> failures_ ZK_GUARDED_BY(mutex_);
  int writes_ ZK_GUARDED_BY(mutex_) = 0;
};

}  // namespace zelkord
