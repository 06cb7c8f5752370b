#pragma once

#include <atomic>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "zelkord/feedback/SessionStorage.h"
#include "zelkord/storage/FileContainer.h"

namespace zelkord {

class Assembly;

// Owns the containers in the caches directory: files "session.N", N below 2^31.
//
// A container is open for writing from `createFileContainerForWriting` until its session is closed;
// then, like those that an earlier process left, it is available until it is deleted. At the start
// those that are too old go, and one that ends within a record is cut back to its last whole one
// before it is handed out. New ones have numbers beyond those found. All of them together stay
// within the bounds of ContainerRoom.
//
// Threading: any thread. Making a container makes its file; everything else that touches the disk
// runs on the storage's queue.
// Ownership: the assembly outlives this; containers may outlive it.
// Errors: logged.
class ZelkorPersistentStorage final : public SessionStorage,
                                      public std::enable_shared_from_this<ZelkorPersistentStorage> {
 public:
  explicit ZelkorPersistentStorage(Assembly& assembly);

  // Finds what an earlier process left. Once, before anything else.
  void start();

  std::shared_ptr<SessionContainer> createFileContainerForWriting(
      SessionKind kind, const std::string& holder) override;
  void closeSession(std::shared_ptr<SessionContainer> container) override;
  std::vector<std::shared_ptr<SessionContainer>> getAvailableSessionHandles() override;
  void deleteSessionWithFileContainer(std::shared_ptr<SessionContainer> container) override;
  // Returns when everything handed over so far is in its file.
  void waitForPendingWrites() override;

 private:
  struct Found {
    std::string path;
    std::int64_t number = 0;
    FileAttributes attributes;
  };
  // What a look into the directory gives.
  struct Scan {
    std::vector<Found> kept;
    std::vector<std::string> tooOld;  // paths
  };

  std::optional<std::string> _newFileUrl();
  Scan _scanCacheDirectory();
  void _scanFile(const std::string& name, Scan& scan, std::int64_t& largest);
  void _continueAfter(std::int64_t largest);
  void _offer(Scan scan);
  void _trim(const std::string& path);
  void _deleteSessionFile(const std::string& path);

  // Fixed after construction.
  Assembly& assembly_;
  const Logger& log_;
  const std::string cachesUrl_;
  const double maxFileAge_;  // seconds
  const FileContainer::Services services_;
  SerialQueue& queue_;

  std::atomic<std::uint32_t> handleId_ = 0;  // of the next file
};

}  // namespace zelkord
