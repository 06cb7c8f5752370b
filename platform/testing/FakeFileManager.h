#pragma once

#include <map>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "base/Mutex.h"
#include "platform/api/ContainerFiles.h"
#include "platform/api/FileManager.h"

namespace zelkord {

// Files in memory, under directories that can be told to fail.
//
// The directories are "/caches", "/state" and "/runtime" unless given; a test of a component that
// opens files by itself gives real ones. Like on a disk, a file needs its directory.
//
// Threading: any thread. Ownership: files open for appending may outlive it.
class FakeFileManager final : public FileManager, public ContainerFiles {
 public:
  enum class Operation {
    CreateDirectory,
    Read,
    Open,
    Map,
    Write,
    SetPermissions,
    Remove,
    List,
    Attributes,
    CreateExclusively,
    OpenForAppending,
    Append,
    Cut
  };

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

  std::optional<std::vector<std::string>> list(const std::string& directory, Error* error) override;
  std::optional<FileAttributes> attributes(const std::string& path, Error* error) override;
  std::optional<Error> createExclusively(const std::string& path) override;
  std::unique_ptr<AppendFile> openForAppending(const std::string& path, Error* error) override;
  std::optional<Error> cut(const std::string& path, std::uint64_t length) override;

  // Failure injection: every call of that operation fails with `number` (ENOSPC, EACCES, ...); zero
  // ends it.
  void fail(Operation operation, int number);
  // How many more bytes can be appended, to all files together, before the disk is full.
  void setRoomToAppend(std::optional<std::uint64_t> bytes);
  // When the file was made; what is put or made otherwise is as old as a timeline.
  void setCreated(const std::string& path, WallTime created);
  void putDirectory(const std::string& path);
  // What a write that others made without care leaves after a power cut: the first `size` bytes.
  void tear(const std::string& path, std::size_t size);

  // The disk as the test sees it; no failure applies. `put` makes the directory too.
  void put(const std::string& path, std::string bytes, unsigned mode = 0600);
  std::optional<std::string> bytes(const std::string& path) const;
  std::optional<unsigned> mode(const std::string& path) const;
  std::vector<std::string> paths() const;
  // How many writes succeeded.
  int writes() const;
  // How many files are open for appending.
  int openForAppend() const;

 private:
  class Appending;
  struct File {
    std::string bytes;
    unsigned mode = 0600;
    WallTime created{std::chrono::seconds{1'795'348'800}};
  };
  // The disk.
  struct State {
    mutable Mutex mutex;
    std::map<std::string, File> files ZK_GUARDED_BY(mutex);
    std::set<std::string> folders ZK_GUARDED_BY(mutex);
    std::map<Operation, int> failures ZK_GUARDED_BY(mutex);
    std::optional<std::uint64_t> roomToAppend ZK_GUARDED_BY(mutex);
    int writes ZK_GUARDED_BY(mutex) = 0;
    int openForAppend ZK_GUARDED_BY(mutex) = 0;

    std::optional<Error> injected(Operation operation) const ZK_REQUIRES(mutex);
    void addDirectories(const std::string& path) ZK_REQUIRES(mutex);
  };

  const Directories directories_;
  const std::shared_ptr<State> state_ = std::make_shared<State>();
};

}  // namespace zelkord
