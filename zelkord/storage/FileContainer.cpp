#include "zelkord/storage/FileContainer.h"

#include <cerrno>
#include <exception>
#include <utility>

#include "platform/api/mmapFileHandle.h"
#include "zelkord/storage/SessionUnarchiver.h"

namespace zelkord {
namespace {

constexpr std::string_view kFileSizeExceeded = "com.quenta.zelkord.filesizeexceeded";
constexpr std::string_view kFileTooLarge = "com.quenta.zelkord.filetoolarge";

// A thread's memory for laying out records; a large one is not kept.
class Layout final {
 public:
  Layout() { text().clear(); }
  ~Layout() {
    constexpr std::size_t kKept = 64 * 1024;
    if (text().capacity() > kKept) text() = std::string();
  }
  Layout(const Layout&) = delete;
  Layout& operator=(const Layout&) = delete;

  std::string& text() {
    thread_local std::string bytes;
    return bytes;
  }
};

}  // namespace

FileContainer::FileContainer(Services services, std::string fileUrl)
    : services_(std::move(services)),
      queue_(*services_->queue),
      fileUrl_(std::move(fileUrl)),
      waiting_(0, services_->maxFileSize),
      isOpen_(false) {
  waiting_.close();
}

FileContainer::FileContainer(Services services, std::string fileUrl, ContainerRoom::Id place)
    : services_(std::move(services)),
      queue_(*services_->queue),
      fileUrl_(std::move(fileUrl)),
      place_(place),
      waiting_(0, services_->maxFileSize),
      isOpen_(true) {}

// A session that nobody completed has ended too.
FileContainer::~FileContainer() {
  if (place_) services_->room->end(*place_, fileUrl_);
}

void FileContainer::writeSessionHeader(const CZClientSession& header) {
  std::string message;
  appendRecord(header, message);
  _add(RecordKind::Version, services_->version, nullptr, nullptr);
  _add(RecordKind::Header, message, nullptr, nullptr);
}

void FileContainer::writeFeedback(const ZelkorFeedback& feedback, std::function<void()> done) {
  if (!waiting_.isOpen()) return;
  Layout layout;
  // The time since the session's beginning is for whoever reads the session to find out.
  appendStoredFeedback({.feedback = feedback.feedback,
                        .queryId = feedback.queryId,
                        .clientQueryId = feedback.clientQueryId},
                       layout.text());
  _add(RecordKind::Feedback, layout.text(), std::move(done), feedback.held);
}

void FileContainer::_add(RecordKind kind, std::string_view payload, std::function<void()> done,
                         std::shared_ptr<const void> held) {
  waiting_.add(kind, payload, std::move(done), std::move(held),
               [this] { queue_.async([self = shared_from_this()] { self->_writeWaiting(); }); });
}

void FileContainer::_writeWaiting() {
  queue_.assertCurrent();
  waiting_.take(writing_);
  _writeBatch();
  writing_.clear();
}

// All at once; when that fails one by one, so that what fits on the disk is kept.
void FileContainer::_writeBatch() {
  queue_.assertCurrent();
  const auto transaction = services_->transactions.open("archiveObject");
  std::string_view rest = writing_.bytes;
  const auto file = isOpen_ && !rest.empty() ? _openFile() : nullptr;
  const bool whole = rest.empty() || _archiveData(file, rest);
  const bool single = writing_.records.size() == 1;
  for (auto& record : writing_.records) {
    const bool fits = record.fit == RecordFit::Fits;
    const bool written =
        fits && (whole || (!single && _archiveData(file, rest.substr(0, record.size()))));
    rest.remove_prefix(record.size());
    if (!isOpen_ && record.kind == RecordKind::Feedback) continue;
    if (fits && !written) waiting_.giveBack(record.size());
    _finish(record, written);
  }
}

AppendFile* FileContainer::_openFile() {
  queue_.assertCurrent();
  auto& last = *services_->lastFile;
  if (auto* const file = last.of(*place_)) return file;
  return last.keep(*place_, _openForAppending());
}

// What stands behind the records that were written is half a record, which could not be cut off
// when it was.
std::unique_ptr<AppendFile> FileContainer::_openForAppending() {
  queue_.assertCurrent();
  Error error;
  auto& files = services_->containerFiles;
  auto file = files.openForAppending(fileUrl_, &error);
  if (file && file->length() > length_) {
    file = nullptr;
    const auto problem = files.cut(fileUrl_, length_);
    if (problem) error = *problem;
    if (!problem) file = files.openForAppending(fileUrl_, &error);
  }
  if (file && file->length() < length_) {
    file = nullptr;
    error = posixError(EIO);  // others have cut it: what follows would not be read back
  }
  if (!file) _complain(error);
  return file;
}

void FileContainer::_complain(const Error& error) {
  queue_.assertCurrent();
  if (std::exchange(failed_, true)) return;
  services_->log.error("could not write to {}: {}", fileUrl_, error.description());
}

bool FileContainer::_archiveData(AppendFile* file, std::string_view framed) {
  queue_.assertCurrent();
  if (!file || !isOpen_ || !services_->room->grow(*place_, framed.size())) return false;
  const auto error = file->append(framed);
  if (error) {
    services_->room->giveBack(*place_, framed.size());
    _complain(*error);
  } else {
    length_ += framed.size();
  }
  return !error;
}

void FileContainer::_finish(const WaitingRecord& record, bool written) {
  queue_.assertCurrent();
  if (record.fit == RecordFit::TooLarge) {
    services_->reporter.addValue(1, kFileSizeExceeded);
    services_->log.error("bytes written ({}) + feedback ({}) exceeds max session size ({})",
                         record.offset, record.payload, services_->maxFileSize);
  }
  if (!written && record.kind != RecordKind::Feedback) {
    services_->log.error("{}", record.kind == RecordKind::Version ? "Could not write version string"
                                                                  : "Could not write root object");
    _closeFile();
  }
  if (record.done) record.done();
}

void FileContainer::close() {
  waiting_.close();
  queue_.async([self = shared_from_this()] { self->_closeFile(); });
}

void FileContainer::_closeFile() {
  queue_.assertCurrent();
  waiting_.close();
  if (!std::exchange(isOpen_, false)) return;
  services_->lastFile->letGo(*place_);
  services_->log.info("close file url {}", fileUrl_);
}

std::optional<StoredSession> FileContainer::read() {
  std::optional<StoredSession> session;
  queue_.sync([&] { session = _read(); });
  return session;
}

std::optional<StoredSession> FileContainer::_read() {
  queue_.assertCurrent();
  const auto& log = services_->log;
  log.info("reading file url {}", fileUrl_);
  if (isOpen_) {
    log.fault("file is already open closing it {}", fileUrl_);
    _closeFile();
  }
  if (!_checkSize()) return std::nullopt;
  const auto handle = services_->files.openForReading(fileUrl_, nullptr);
  if (!handle) {
    log.error("Could not open file for reading {}", fileUrl_);
    return std::nullopt;
  }
  return _unarchiveObject(handle.get());
}

bool FileContainer::_checkSize() {
  const auto& log = services_->log;
  Error error;
  if (fileUrl_.empty()) {
    log.error("No file url available");
    return false;
  }
  if (fileUrl_.front() != '/') {
    log.error("url to path returned nil");
    return false;
  }
  const auto attributes = services_->containerFiles.attributes(fileUrl_, &error);
  if (!attributes) {
    log.error("Attribute fetch error {}", error.description());
    return false;
  }
  if (attributes->size <= services_->maxFileSize) return true;
  services_->reporter.addValue(1, kFileTooLarge);
  log.error("Session too big to process");
  return false;
}

std::optional<StoredSession> FileContainer::_unarchiveObject(FileHandle* handle) {
  const auto& log = services_->log;
  if (!handle) {
    log.error("file handle nil");
    return std::nullopt;
  }
  Error error;
  auto data = mmapFileHandle(*handle, &error, services_->maxFileSize);
  if (!data) {
    log.error("mmap: {}", error.description());
    return std::nullopt;
  }
  if (data->empty()) log.error("empty file");
  try {
    auto session = SessionUnarchiver(std::move(*data), log).read(services_->version);
    if (session) log.info("unarchive {}", fileUrl_);
    return session;
  } catch (const std::exception& exception) {
    log.error("exception reading session archive {}", exception.what());
    return std::nullopt;
  }
}

}  // namespace zelkord
