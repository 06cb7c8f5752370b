#include "zelkord/storage/ContainerRoom.h"

#include <utility>

namespace zelkord {
namespace {

bool isWithin(const ContainerRoom::Amount& bound, const ContainerRoom::Amount& used,
              const ContainerRoom::Amount& more) {
  return used.files + more.files <= bound.files && used.bytes + more.bytes <= bound.bytes;
}

}  // namespace

ContainerRoom::ContainerRoom(FileManager& files, LimitReports& limits, const Logger& log)
    : files_(files), limits_(limits), log_(log) {}

std::optional<ContainerRoom::Id> ContainerRoom::open(SessionKind kind) {
  std::vector<std::string> gone;
  std::optional<Id> id;
  {
    const MutexLock lock(mutex_);
    if (_makeRoom(kind, {1, 0}, gone)) id = _add({.kind = kind});
  }
  _finish(kind, gone, id.has_value());
  return id;
}

bool ContainerRoom::grow(Id container, std::uint64_t bytes) {
  std::vector<std::string> gone;
  bool fits = false;
  auto kind = SessionKind::Managed;
  {
    const MutexLock lock(mutex_);
    const auto place = containers_.find(container);
    if (place == containers_.end()) return false;
    kind = place->second.kind;
    fits = _makeRoom(kind, {0, bytes}, gone);
    if (fits) {
      place->second.bytes += bytes;
      _count(place->second, bytes, true);
    }
  }
  _finish(kind, gone, fits);
  return fits;
}

void ContainerRoom::giveBack(Id container, std::uint64_t bytes) {
  const MutexLock lock(mutex_);
  const auto place = containers_.find(container);
  if (place == containers_.end()) return;
  place->second.bytes -= bytes;
  _count(place->second, bytes, false);
}

void ContainerRoom::end(Id container, const std::string& path) {
  const MutexLock lock(mutex_);
  const auto place = containers_.find(container);
  if (place == containers_.end() || place->second.ended) return;
  place->second.path = path;
  place->second.ended = ++lastEnded_;
  ended_.emplace(lastEnded_, container);
}

void ContainerRoom::forget(Id container) {
  const MutexLock lock(mutex_);
  const auto place = containers_.find(container);
  if (place != containers_.end()) _drop(place);
}

void ContainerRoom::forget(const std::string& path) {
  const MutexLock lock(mutex_);
  for (const auto& [order, id] : ended_) {
    const auto place = containers_.find(id);
    if (place->second.path == path) return _drop(place);
  }
}

// Adding and making room in turn would need no more room than there is, but would remove the newest
// where the oldest should go.
void ContainerRoom::adopt(const std::vector<std::pair<std::string, std::uint64_t>>& pathsAndSizes) {
  std::vector<std::string> gone;
  {
    const MutexLock lock(mutex_);
    for (const auto& [path, size] : pathsAndSizes) {
      const auto id = _add({.bytes = size, .ended = ++lastEnded_, .path = path});
      ended_.emplace(lastEnded_, id);
    }
    _makeRoom(SessionKind::Managed, {}, gone);
  }
  _finish(SessionKind::Managed, gone, true);
}

std::vector<std::string> ContainerRoom::endedPaths() const {
  const MutexLock lock(mutex_);
  std::vector<std::string> paths;
  for (const auto& [order, id] : ended_) paths.push_back(containers_.at(id).path);
  return paths;
}

ContainerRoom::Amount ContainerRoom::used() const {
  const MutexLock lock(mutex_);
  return inAll_;
}

bool ContainerRoom::_fits(SessionKind kind, Amount more) const {
  return isWithin(kInAll, inAll_, more) &&
         (kind == SessionKind::Managed || isWithin(kOfOneOff, ofOneOff_, more));
}

bool ContainerRoom::_makeRoom(SessionKind kind, Amount more, std::vector<std::string>& gone) {
  while (!_fits(kind, more)) {
    const auto next = _next(kind, more);
    if (!next) return false;
    const auto place = containers_.find(*next);
    gone.push_back(place->second.path);
    _drop(place);
  }
  return true;
}

// Where one-off sessions have used up their part, one of them goes.
std::optional<ContainerRoom::Id> ContainerRoom::_next(SessionKind kind, Amount more) const {
  const bool mustBeOneOff = kind == SessionKind::OneOff && !isWithin(kOfOneOff, ofOneOff_, more);
  for (const auto& [order, id] : ended_) {
    if (!mustBeOneOff || containers_.at(id).kind == SessionKind::OneOff) return id;
  }
  return std::nullopt;
}

ContainerRoom::Id ContainerRoom::_add(Container container) {
  ++inAll_.files;
  if (container.kind == SessionKind::OneOff) ++ofOneOff_.files;
  _count(container, container.bytes, true);
  containers_.emplace(++lastId_, std::move(container));
  return lastId_;
}

void ContainerRoom::_count(const Container& container, std::uint64_t bytes, bool isMore) {
  const auto change = isMore ? bytes : std::uint64_t{0} - bytes;
  inAll_.bytes += change;
  if (container.kind == SessionKind::OneOff) ofOneOff_.bytes += change;
}

void ContainerRoom::_drop(Containers::iterator place) {
  const auto& container = place->second;
  --inAll_.files;
  if (container.kind == SessionKind::OneOff) --ofOneOff_.files;
  _count(container, container.bytes, false);
  if (container.ended) ended_.erase(*container.ended);
  containers_.erase(place);
}

void ContainerRoom::_finish(SessionKind kind, const std::vector<std::string>& gone, bool fits) {
  const char* const holder = kind == SessionKind::OneOff ? "one-off sessions" : "sessions";
  for (const auto& path : gone) {
    log_.info("delete file url {}", path);
    if (files_.remove(path)) log_.error("File {} delete failed", path);
  }
  if (!gone.empty()) limits_.refused("containers", holder, gone.size());
  if (!fits) limits_.refused("containers_full", holder);
}

}  // namespace zelkord
