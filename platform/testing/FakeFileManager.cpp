#include "platform/testing/FakeFileManager.h"

#include <cerrno>

namespace zelkord {
namespace {

class Handle final : public FileHandle {
 public:
  Handle(std::string bytes, std::optional<Error> failure)
      : bytes_(std::move(bytes)), failure_(std::move(failure)) {
    if (!failure_ && bytes_.empty()) failure_ = posixError(EINVAL);
  }

  std::optional<Data> map(Error* error) override {
    if (!failure_) return Data(bytes_);
    if (error) *error = *failure_;
    return std::nullopt;
  }

 private:
  const std::string bytes_;
  std::optional<Error> failure_;
};

std::string folderOf(const std::string& path) { return path.substr(0, path.rfind('/')); }

}  // namespace

FakeFileManager::FakeFileManager() : FakeFileManager({"/caches", "/state", "/runtime"}) {}

FakeFileManager::FakeFileManager(Directories directories) : directories_(std::move(directories)) {
  const MutexLock lock(mutex_);
  for (const auto& path : {directories_.caches, directories_.state, directories_.runtime}) {
    addDirectories(path);
  }
}

std::optional<Error> FakeFileManager::injected(Operation operation) const {
  const auto found = failures_.find(operation);
  return found == failures_.end() ? std::nullopt : std::optional(posixError(found->second));
}

void FakeFileManager::addDirectories(const std::string& path) {
  for (auto folder = path; !folder.empty(); folder = folderOf(folder)) folders_.insert(folder);
}

std::optional<Error> FakeFileManager::createDirectory(const std::string& path) {
  const MutexLock lock(mutex_);
  if (auto error = injected(Operation::CreateDirectory)) return error;
  if (files_.contains(path)) return posixError(EEXIST);
  addDirectories(path);
  return std::nullopt;
}

std::optional<std::string> FakeFileManager::read(const std::string& path, std::uint64_t limit,
                                                 Error* error) {
  const auto failed = [error](Error failure) -> std::optional<std::string> {
    if (error) *error = std::move(failure);
    return std::nullopt;
  };
  const MutexLock lock(mutex_);
  if (auto failure = injected(Operation::Read)) return failed(*failure);
  if (folders_.contains(path)) return failed(posixError(EISDIR));
  const auto found = files_.find(path);
  if (found == files_.end()) return failed(posixError(ENOENT));
  if (found->second.bytes.size() > limit) return failed(posixError(EFBIG));
  return found->second.bytes;
}

std::unique_ptr<FileHandle> FakeFileManager::openForReading(const std::string& path, Error* error) {
  const MutexLock lock(mutex_);
  const auto found = files_.find(path);
  auto failure = injected(Operation::Open);
  if (!failure && found == files_.end()) failure = posixError(ENOENT);
  if (!failure) return std::make_unique<Handle>(found->second.bytes, injected(Operation::Map));
  if (error) *error = std::move(*failure);
  return nullptr;
}

std::optional<Error> FakeFileManager::writeAtomically(const std::string& path,
                                                      std::string_view bytes, unsigned mode) {
  const MutexLock lock(mutex_);
  if (auto error = injected(Operation::Write)) return error;
  if (!folders_.contains(folderOf(path))) return posixError(ENOENT);
  if (folders_.contains(path)) return posixError(EISDIR);
  files_[path] = {std::string(bytes), mode};
  ++writes_;
  return std::nullopt;
}

std::optional<Error> FakeFileManager::setPermissions(const std::string& path, unsigned mode) {
  const MutexLock lock(mutex_);
  if (auto error = injected(Operation::SetPermissions)) return error;
  const auto found = files_.find(path);
  if (found == files_.end()) return posixError(ENOENT);
  found->second.mode = mode;
  return std::nullopt;
}

std::optional<Error> FakeFileManager::remove(const std::string& path) {
  const MutexLock lock(mutex_);
  if (auto error = injected(Operation::Remove)) return error;
  return files_.erase(path) == 0 ? std::optional(posixError(ENOENT)) : std::nullopt;
}

void FakeFileManager::fail(Operation operation, int number) {
  const MutexLock lock(mutex_);
  if (number == 0) {
    failures_.erase(operation);
  } else {
    failures_[operation] = number;
  }
}

void FakeFileManager::tear(const std::string& path, std::size_t size) {
  const MutexLock lock(mutex_);
  const auto found = files_.find(path);
  if (found != files_.end() && size < found->second.bytes.size()) found->second.bytes.resize(size);
}

void FakeFileManager::put(const std::string& path, std::string bytes, unsigned mode) {
  const MutexLock lock(mutex_);
  addDirectories(folderOf(path));
  files_[path] = {std::move(bytes), mode};
}

std::optional<std::string> FakeFileManager::bytes(const std::string& path) const {
  const MutexLock lock(mutex_);
  const auto found = files_.find(path);
  return found == files_.end() ? std::nullopt : std::optional(found->second.bytes);
}

std::optional<unsigned> FakeFileManager::mode(const std::string& path) const {
  const MutexLock lock(mutex_);
  const auto found = files_.find(path);
  return found == files_.end() ? std::nullopt : std::optional(found->second.mode);
}

std::vector<std::string> FakeFileManager::paths() const {
  const MutexLock lock(mutex_);
  std::vector<std::string> paths;
  for (const auto& entry : files_) paths.push_back(entry.first);
  return paths;
}

int FakeFileManager::writes() const {
  const MutexLock lock(mutex_);
  return writes_;
}

}  // namespace zelkord
