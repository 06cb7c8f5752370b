#include "zelkord/storage/ZelkorPersistentStorage.h"

#include <algorithm>
#include <cerrno>
#include <limits>
#include <utility>

#include "platform/api/mmapFileHandle.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/assembly/UserAgent.h"
#include "zelkord/storage/ContainerFormat.h"

namespace zelkord {
namespace {

constexpr std::string_view kFileTooOld = "com.quenta.zelkord.filetooold";
constexpr std::string_view kNamePrefix = "session.";
constexpr std::uint32_t kHandles = 1u << 31;

// None for other names.
std::optional<std::int64_t> handleNumber(std::string_view name) {
  if (!name.starts_with(kNamePrefix) || name == kNamePrefix) return std::nullopt;
  std::int64_t number = 0;
  for (const char digit : name.substr(kNamePrefix.size())) {
    if (digit < '0' || digit > '9') return std::nullopt;
    number = number * 10 + (digit - '0');
    if (number >= kHandles) return std::nullopt;
  }
  return number;
}

FileContainer::Services makeServices(Assembly& assembly) {
  auto& platform = assembly.platform();
  auto queue = platform.queues.makeSerialQueue("com.quenta.zelkord.persistentStorageQueue");
  return std::make_shared<const ContainerServices>(ContainerServices{
      .queue = std::move(queue),
      .files = platform.files,
      .containerFiles = platform.containerFiles,
      .transactions = platform.transactions,
      .log = assembly.log(Category::FeedbackStorage),
      .reporter = assembly.reporter(),
      .room = std::make_shared<ContainerRoom>(platform.files, assembly.limits(),
                                              assembly.log(Category::FeedbackStorage)),
      .lastFile = std::make_shared<LastFile>(),
      .version = zelkordUserAgent(platform.device).value_or(std::string()),
      .maxFileSize = bytesSetting(platform.settings, "ZLKSessionSizeLimit")});
}

}  // namespace

ZelkorPersistentStorage::ZelkorPersistentStorage(Assembly& assembly)
    : assembly_(assembly),
      log_(assembly.log(Category::FeedbackStorage)),
      cachesUrl_(assembly.fileManager().directories().caches),
      maxFileAge_(secondsSetting(assembly.userDefaults(), "ZLKSessionMaxAge")),
      services_(makeServices(assembly)),
      queue_(*services_->queue) {}

// Numbers must be known before the first new container; all the rest can wait.
void ZelkorPersistentStorage::start() {
  queue_.async([weak = weak_from_this(), scan = _scanCacheDirectory()]() mutable {
    if (const auto self = weak.lock()) self->_offer(std::move(scan));
  });
}

// That the file can be written is tried now, while its session can still be told.
std::shared_ptr<SessionContainer> ZelkorPersistentStorage::createFileContainerForWriting(
    SessionKind kind, const std::string& holder) {
  const auto place = services_->room->open(kind, holder);
  if (!place) return nullptr;
  const auto url = _newFileUrl();
  if (!url) {
    log_.error("Could not get a file url");
    services_->room->forget(*place);
    return nullptr;
  }
  log_.info("new file url {}", *url);
  if (services_->containerFiles.openForAppending(*url, nullptr)) {
    return std::make_shared<FileContainer>(services_, *url, *place);
  }
  log_.error("Could not open file for writing {}", *url);
  services_->files.remove(*url);
  services_->room->forget(*place);
  return nullptr;
}

// The numbers go round, so that a file with the last one does not end them.
std::optional<std::string> ZelkorPersistentStorage::_newFileUrl() {
  constexpr int kAttempts = 100'000;
  if (cachesUrl_.empty()) return std::nullopt;
  services_->files.createDirectory(cachesUrl_);
  for (int i = 0; i < kAttempts; ++i) {
    const auto number = handleId_.fetch_add(1) % kHandles;
    auto path = cachesUrl_ + "/" + std::string(kNamePrefix) + std::to_string(number);
    const auto error = services_->containerFiles.createExclusively(path);
    if (!error) return path;
    if (error->code != EEXIST) return std::nullopt;
  }
  return std::nullopt;
}

void ZelkorPersistentStorage::closeSession(std::shared_ptr<SessionContainer> container) {
  auto file = std::dynamic_pointer_cast<FileContainer>(std::move(container));
  if (!file || !file->place()) return;
  file->close();
  queue_.async([file = std::move(file), services = services_] {
    services->room->end(*file->place(), file->fileUrl());
  });
}

std::vector<std::shared_ptr<SessionContainer>>
ZelkorPersistentStorage::getAvailableSessionHandles() {
  std::vector<std::string> paths;
  queue_.sync([&] { paths = services_->room->endedPaths(); });
  std::vector<std::shared_ptr<SessionContainer>> available;
  for (auto& path : paths) {
    log_.info("available file url {}", path);
    available.push_back(std::make_shared<FileContainer>(services_, std::move(path)));
  }
  return available;
}

void ZelkorPersistentStorage::deleteSessionWithFileContainer(
    std::shared_ptr<SessionContainer> container) {
  auto file = std::dynamic_pointer_cast<FileContainer>(std::move(container));
  if (!file) return;
  file->close();
  queue_.async([self = shared_from_this(), file = std::move(file)] {
    self->queue_.assertCurrent();
    if (file->place()) self->services_->room->forget(*file->place());
    self->services_->room->forget(file->fileUrl());
    self->_deleteSessionFile(file->fileUrl());
  });
}

void ZelkorPersistentStorage::waitForPendingWrites() {
  queue_.sync([] {});
}

ZelkorPersistentStorage::Scan ZelkorPersistentStorage::_scanCacheDirectory() {
  Scan scan;
  if (cachesUrl_.empty()) {
    log_.error("error scanning cache directory, could not get path");
    return scan;
  }
  Error error;
  const auto names = services_->containerFiles.list(cachesUrl_, &error);
  if (!names) {
    log_.error("error scanning cache directory {}", error.description());
    return scan;
  }
  auto largest = std::numeric_limits<std::int64_t>::min();
  for (const auto& name : *names) _scanFile(name, scan, largest);
  _continueAfter(largest);
  return scan;
}

void ZelkorPersistentStorage::_scanFile(const std::string& name, Scan& scan,
                                        std::int64_t& largest) {
  const auto number = handleNumber(name);
  if (!number) return;
  const auto path = cachesUrl_ + "/" + name;
  Error error;
  const auto attributes = services_->containerFiles.attributes(path, &error);
  if (!attributes || !attributes->isRegular) {
    log_.error("{} is not a container: {}", path,
               attributes ? "not a regular file" : error.description());
    return;
  }
  const double now = secondsSince1970(assembly_.platform().clock.wallNow());
  if (now - secondsSince1970(attributes->created) > maxFileAge_) {
    services_->reporter.addValue(1, kFileTooOld);
    scan.tooOld.push_back(path);
    return;
  }
  largest = std::max(largest, *number);
  scan.kept.push_back({path, *number, *attributes});
}

void ZelkorPersistentStorage::_continueAfter(std::int64_t largest) {
  auto current = handleId_.load();
  if (largest < static_cast<std::int64_t>(current)) return;
  handleId_.compare_exchange_strong(current, static_cast<std::uint32_t>(largest + 1));
}

void ZelkorPersistentStorage::_offer(Scan scan) {
  queue_.assertCurrent();
  for (const auto& path : scan.tooOld) _deleteSessionFile(path);
  std::sort(scan.kept.begin(), scan.kept.end(), [](const Found& a, const Found& b) {
    return std::pair(a.attributes.created, a.number) < std::pair(b.attributes.created, b.number);
  });
  std::vector<std::pair<std::string, std::uint64_t>> files;
  for (const auto& found : scan.kept) files.emplace_back(found.path, found.attributes.size);
  services_->room->adopt(files);
  for (const auto& path : services_->room->endedPaths()) _trim(path);
}

// Without its bytes there is nothing to cut: an empty file, or one that reading will complain of.
void ZelkorPersistentStorage::_trim(const std::string& path) {
  std::optional<std::uint64_t> end;
  std::uint64_t size = 0;
  if (const auto file = services_->files.openForReading(path, nullptr)) {
    const auto data = mmapFileHandle(*file, nullptr, services_->maxFileSize);
    if (!data) return;
    size = data->size();
    end = endOfWholeRecords(data->view(), services_->maxFileSize);
  }
  if (!end) return;
  const auto error = services_->containerFiles.cut(path, *end);
  if (error) {
    log_.error("could not cut {} back to {} bytes: {}", path, *end, error->description());
  } else {
    log_.notice("cut {} back from {} to {} bytes, the end of its last whole record", path, size,
                *end);
  }
}

void ZelkorPersistentStorage::_deleteSessionFile(const std::string& path) {
  queue_.assertCurrent();
  if (path.empty()) {
    log_.fault("Handle {} does not have a File URL", "(null)");
    return;
  }
  log_.info("delete file url {}", path);
  if (services_->files.remove(path)) log_.error("File {} delete failed", path);
}

}  // namespace zelkord
