#pragma once

#include <atomic>
#include <memory>
#include <optional>
#include <string>

#include "platform/api/ContainerFiles.h"
#include "platform/api/FileManager.h"
#include "platform/api/ProcessTransactions.h"
#include "platform/api/WorkQueue.h"
#include "zelkord/assembly/ZelkorDiagnosticDataReporter.h"
#include "zelkord/feedback/SessionStorage.h"
#include "zelkord/feedback/StoredSession.h"
#include "zelkord/storage/ContainerRoom.h"
#include "zelkord/storage/LastFile.h"
#include "zelkord/storage/WaitingRecords.h"

namespace zelkord {

// What the containers of a storage share. The references outlive them.
struct ContainerServices {
  std::shared_ptr<SerialQueue> queue;
  FileManager& files;
  ContainerFiles& containerFiles;
  ProcessTransactions& transactions;
  const Logger& log;
  const ZelkorDiagnosticDataReporter& reporter;
  std::shared_ptr<ContainerRoom> room;
  std::shared_ptr<LastFile> lastFile;  // of the queue
  std::string version;
  std::uint64_t maxFileSize = 0;  // no container reaches it
};

// The file of one session.
//
// It is open for writing until it is closed, or until its version or header cannot be written;
// after that, and when it was made for a file that exists, it can only be read.
//
// A record is laid out by whoever hands it over and waits in memory, bounded by the file's limit,
// for the storage's queue, which writes everything that waits with one call. So a process that is
// killed leaves at most its last records out, and one cut short. Of the hundreds of containers that
// there may be, only the one that wrote last has its file open.
//
// Threading: any thread. Ownership: tasks on the queue keep a container until its records are
// written. Errors: logged; a record that is too large, or for which the disk has no room, is
// counted too.
class FileContainer final : public SessionContainer,
                            public std::enable_shared_from_this<FileContainer> {
 public:
  using Services = std::shared_ptr<const ContainerServices>;

  // Closed, for a file that exists.
  FileContainer(Services services, std::string fileUrl);
  // Open for writing, for an empty file that has this place.
  FileContainer(Services services, std::string fileUrl, ContainerRoom::Id place);
  FileContainer(const FileContainer&) = delete;
  FileContainer& operator=(const FileContainer&) = delete;
  ~FileContainer() override;

  void writeSessionHeader(const CZClientSession& header) override;
  void writeFeedback(const ZelkorFeedback& feedback, std::function<void()> done) override;
  std::optional<StoredSession> read() override;
  // What is written after this call is forgotten, what was written before it is not.
  void close();
  // The file's path.
  const std::string& fileUrl() const { return fileUrl_; }
  // Where it is in its room, if it was open for writing.
  const std::optional<ContainerRoom::Id>& place() const { return place_; }

 private:
  void _add(RecordKind kind, std::string_view payload, std::function<void()> done,
            std::shared_ptr<const void> held);
  void _writeWaiting();
  void _writeBatch();
  AppendFile* _openFile();
  std::unique_ptr<AppendFile> _openForAppending();
  bool _archiveData(AppendFile* file, std::string_view framed);
  void _complain(const Error& error);
  void _finish(const WaitingRecord& record, bool written);
  void _closeFile();
  std::optional<StoredSession> _read();
  bool _checkSize();
  std::optional<StoredSession> _unarchiveObject(FileHandle* handle);

  // Fixed after construction.
  const Services services_;
  SerialQueue& queue_;
  const std::string fileUrl_;
  const std::optional<ContainerRoom::Id> place_;

  WaitingRecords waiting_;

  // Queue state.
  bool isOpen_ ZK_ON(queue_);
  std::uint64_t length_ ZK_ON(queue_) = 0;  // of what was written
  RecordBatch writing_ ZK_ON(queue_);
  bool failed_ ZK_ON(queue_) = false;  // and that was logged
};

}  // namespace zelkord
