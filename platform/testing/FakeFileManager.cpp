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

  std::optional<Data> map(std::uint64_t limit, Error* error) override {
    if (!failure_ && bytes_.size() <= limit) return Data(bytes_);
    if (error) *error = failure_.value_or(posixError(EFBIG));
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
  const MutexLock lock(state_->mutex);
  for (const auto& path : {directories_.caches, directories_.state, directories_.runtime}) {
    state_->addDirectories(path);
  }
}

std::optional<Error> FakeFileManager::State::injected(Operation operation) const {
  const auto found = failures.find(operation);
  return found == failures.end() ? std::nullopt : std::optional(posixError(found->second));
}

void FakeFileManager::State::addDirectories(const std::string& path) {
  for (auto folder = path; !folder.empty(); folder = folderOf(folder)) folders.insert(folder);
}

std::optional<Error> FakeFileManager::createDirectory(const std::string& path) {
  const MutexLock lock(state_->mutex);
  if (auto error = state_->injected(Operation::CreateDirectory)) return error;
  if (state_->files.contains(path)) return posixError(EEXIST);
  state_->addDirectories(path);
  return std::nullopt;
}

std::optional<std::string> FakeFileManager::read(const std::string& path, std::uint64_t limit,
                                                 Error* error) {
  const auto failed = [error](Error failure) -> std::optional<std::string> {
    if (error) *error = std::move(failure);
    return std::nullopt;
  };
  const MutexLock lock(state_->mutex);
  if (auto failure = state_->injected(Operation::Read)) return failed(*failure);
  if (state_->folders.contains(path)) return failed(posixError(EISDIR));
  const auto found = state_->files.find(path);
  if (found == state_->files.end()) return failed(posixError(ENOENT));
  if (found->second.bytes.size() > limit) return failed(posixError(EFBIG));
  return found->second.bytes;
}

std::unique_ptr<FileHandle> FakeFileManager::openForReading(const std::string& path, Error* error) {
  const MutexLock lock(state_->mutex);
  const auto found = state_->files.find(path);
  auto failure = state_->injected(Operation::Open);
  if (!failure && found == state_->files.end()) failure = posixError(ENOENT);
  if (!failure)
    return std::make_unique<Handle>(found->second.bytes, state_->injected(Operation::Map));
  if (error) *error = std::move(*failure);
  return nullptr;
}

std::optional<Error> FakeFileManager::writeAtomically(const std::string& path,
                                                      std::string_view bytes, unsigned mode) {
  const MutexLock lock(state_->mutex);
  if (auto error = state_->injected(Operation::Write)) return error;
  if (!state_->folders.contains(folderOf(path))) return posixError(ENOENT);
  if (state_->folders.contains(path)) return posixError(EISDIR);
  state_->files[path] = {.bytes = std::string(bytes), .mode = mode};
  ++state_->writes;
  return std::nullopt;
}

std::optional<Error> FakeFileManager::setPermissions(const std::string& path, unsigned mode) {
  const MutexLock lock(state_->mutex);
  if (auto error = state_->injected(Operation::SetPermissions)) return error;
  const auto found = state_->files.find(path);
  if (found == state_->files.end()) return posixError(ENOENT);
  found->second.mode = mode;
  return std::nullopt;
}

std::optional<Error> FakeFileManager::remove(const std::string& path) {
  const MutexLock lock(state_->mutex);
  if (auto error = state_->injected(Operation::Remove)) return error;
  return state_->files.erase(path) == 0 ? std::optional(posixError(ENOENT)) : std::nullopt;
}

std::optional<std::vector<std::string>> FakeFileManager::list(const std::string& directory,
                                                              Error* error) {
  const MutexLock lock(state_->mutex);
  auto failure = state_->injected(Operation::List);
  if (!failure && state_->files.contains(directory)) failure = posixError(ENOTDIR);
  if (!failure && !state_->folders.contains(directory)) failure = posixError(ENOENT);
  if (failure) {
    if (error) *error = std::move(*failure);
    return std::nullopt;
  }
  std::vector<std::string> names;
  const auto addIfInside = [&](const std::string& path) {
    if (folderOf(path) == directory) names.push_back(path.substr(directory.size() + 1));
  };
  for (const auto& entry : state_->files) addIfInside(entry.first);
  for (const auto& folder : state_->folders) addIfInside(folder);
  return names;
}

std::optional<FileAttributes> FakeFileManager::attributes(const std::string& path, Error* error) {
  const MutexLock lock(state_->mutex);
  const auto found = state_->files.find(path);
  auto failure = state_->injected(Operation::Attributes);
  if (!failure && found != state_->files.end()) {
    return FileAttributes{found->second.bytes.size(), found->second.created, true};
  }
  if (!failure && state_->folders.contains(path)) return FileAttributes{0, File{}.created, false};
  if (!failure) failure = posixError(ENOENT);
  if (error) *error = std::move(*failure);
  return std::nullopt;
}

std::optional<Error> FakeFileManager::createExclusively(const std::string& path) {
  const MutexLock lock(state_->mutex);
  if (auto error = state_->injected(Operation::CreateExclusively)) return error;
  if (!state_->folders.contains(folderOf(path))) return posixError(ENOENT);
  if (state_->files.contains(path) || state_->folders.contains(path)) return posixError(EEXIST);
  state_->files[path];
  return std::nullopt;
}

// A file that was removed meanwhile takes what is appended into the void, like on a disk.
class FakeFileManager::Appending final : public AppendFile {
 public:
  Appending(std::shared_ptr<State> state, std::string path, std::uint64_t length)
      : state_(std::move(state)), path_(std::move(path)), length_(length) {}
  ~Appending() override {
    const MutexLock lock(state_->mutex);
    --state_->openForAppend;
  }

  std::uint64_t length() const override { return length_; }

  bool isIntact() const override {
    const MutexLock lock(state_->mutex);
    const auto found = state_->files.find(path_);
    return found != state_->files.end() && found->second.bytes.size() == length_;
  }

  std::optional<Error> append(std::string_view bytes) override {
    const MutexLock lock(state_->mutex);
    if (auto error = state_->injected(Operation::Append)) return error;
    if (state_->roomToAppend) {
      if (bytes.size() > *state_->roomToAppend) return posixError(ENOSPC);
      *state_->roomToAppend -= bytes.size();
    }
    length_ += bytes.size();
    const auto found = state_->files.find(path_);
    if (found != state_->files.end()) found->second.bytes.append(bytes);
    return std::nullopt;
  }

 private:
  const std::shared_ptr<State> state_;
  const std::string path_;
  std::uint64_t length_;
};

std::unique_ptr<AppendFile> FakeFileManager::openForAppending(const std::string& path,
                                                              Error* error) {
  const MutexLock lock(state_->mutex);
  const auto found = state_->files.find(path);
  auto failure = state_->injected(Operation::OpenForAppending);
  if (!failure && state_->folders.contains(path)) failure = posixError(EISDIR);
  if (!failure && found == state_->files.end()) failure = posixError(ENOENT);
  if (!failure) {
    ++state_->openForAppend;
    return std::make_unique<Appending>(state_, path, found->second.bytes.size());
  }
  if (error) *error = std::move(*failure);
  return nullptr;
}

std::optional<Error> FakeFileManager::cut(const std::string& path, std::uint64_t length) {
  const MutexLock lock(state_->mutex);
  if (auto error = state_->injected(Operation::Cut)) return error;
  if (state_->folders.contains(path)) return posixError(EISDIR);
  const auto found = state_->files.find(path);
  if (found == state_->files.end()) return posixError(ENOENT);
  found->second.bytes.resize(length);
  return std::nullopt;
}

void FakeFileManager::setRoomToAppend(std::optional<std::uint64_t> bytes) {
  const MutexLock lock(state_->mutex);
  state_->roomToAppend = bytes;
}

void FakeFileManager::setCreated(const std::string& path, WallTime created) {
  const MutexLock lock(state_->mutex);
  const auto found = state_->files.find(path);
  if (found != state_->files.end()) found->second.created = created;
}

void FakeFileManager::putDirectory(const std::string& path) {
  const MutexLock lock(state_->mutex);
  state_->addDirectories(path);
}

void FakeFileManager::fail(Operation operation, int number) {
  const MutexLock lock(state_->mutex);
  if (number == 0) {
    state_->failures.erase(operation);
  } else {
    state_->failures[operation] = number;
  }
}

void FakeFileManager::tear(const std::string& path, std::size_t size) {
  const MutexLock lock(state_->mutex);
  const auto found = state_->files.find(path);
  if (found != state_->files.end() && size < found->second.bytes.size())
    found->second.bytes.resize(size);
}

void FakeFileManager::put(const std::string& path, std::string bytes, unsigned mode) {
  const MutexLock lock(state_->mutex);
  state_->addDirectories(folderOf(path));
  state_->files[path] = {.bytes = std::move(bytes), .mode = mode};
}

std::optional<std::string> FakeFileManager::bytes(const std::string& path) const {
  const MutexLock lock(state_->mutex);
  const auto found = state_->files.find(path);
  return found == state_->files.end() ? std::nullopt : std::optional(found->second.bytes);
}

std::optional<unsigned> FakeFileManager::mode(const std::string& path) const {
  const MutexLock lock(state_->mutex);
  const auto found = state_->files.find(path);
  return found == state_->files.end() ? std::nullopt : std::optional(found->second.mode);
}

std::vector<std::string> FakeFileManager::paths() const {
  const MutexLock lock(state_->mutex);
  std::vector<std::string> paths;
  for (const auto& entry : state_->files) paths.push_back(entry.first);
  return paths;
}

int FakeFileManager::openForAppend() const {
  const MutexLock lock(state_->mutex);
  return state_->openForAppend;
}

int FakeFileManager::writes() const {
  const MutexLock lock(state_->mutex);
  return state_->writes;
}

}  // namespace zelkord
