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

std::optional<ContainerRoom::Id> ContainerRoom::open(SessionKind kind, const std::string& holder) {
  const Container container{.kind = kind, .holder = holder};
  std::vector<std::string> gone;
  std::optional<Id> id;
  {
    const MutexLock lock(mutex_);
    if (_makeRoom(container, {1, 0}, gone)) id = _add(container);
  }
  _finish(container, gone, id.has_value());
  return id;
}

bool ContainerRoom::grow(Id container, std::uint64_t bytes) {
  std::vector<std::string> gone;
  bool fits = false;
  Container whose;
  {
    const MutexLock lock(mutex_);
    const auto place = containers_.find(container);
    if (place == containers_.end()) return false;
    whose = place->second;
    fits = _makeRoom(whose, {0, bytes}, gone);
    if (fits) {
      place->second.bytes += bytes;
      _count(place->second, bytes, true);
    }
  }
  _finish(whose, gone, fits);
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
    _makeRoom({}, {}, gone);
  }
  _finish({}, gone, true);
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

ContainerRoom::Amount ContainerRoom::_heldBy(const std::string& holder) const {
  const auto held = ofHolders_.find(holder);
  return held == ofHolders_.end() ? Amount{} : held->second;
}

bool ContainerRoom::_makeRoom(const Container& whose, Amount more, std::vector<std::string>& gone) {
  const auto fits = [&]() ZK_REQUIRES(mutex_) {
    return isWithin(kInAll, inAll_, more) &&
           (whose.kind == SessionKind::Managed ||
            (isWithin(kOfOneOff, ofOneOff_, more) &&
             isWithin(kOfOneOffOfAHolder, _heldBy(whose.holder), more)));
  };
  while (!fits()) {
    const auto next = _next(whose, more);
    if (!next) return false;
    const auto place = containers_.find(*next);
    gone.push_back(place->second.path);
    _drop(place);
  }
  return true;
}

std::optional<ContainerRoom::Id> ContainerRoom::_next(const Container& whose, Amount more) const {
  if (whose.kind == SessionKind::Managed) return _oldest();
  if (!isWithin(kOfOneOffOfAHolder, _heldBy(whose.holder), more)) {
    return _oldestOneOffOf(whose.holder);
  }
  if (isWithin(kOfOneOff, ofOneOff_, more)) return _oldest();
  return _oldestOfWhoHasMost(ofOneOff_.bytes + more.bytes > kOfOneOff.bytes);
}

std::optional<ContainerRoom::Id> ContainerRoom::_oldest() const {
  return ended_.empty() ? std::nullopt : std::optional(ended_.begin()->second);
}

std::optional<ContainerRoom::Id> ContainerRoom::_oldestOneOffOf(const std::string& holder) const {
  for (const auto& [order, id] : ended_) {
    const auto& container = containers_.at(id);
    if (container.kind == SessionKind::OneOff && container.holder == holder) return id;
  }
  return std::nullopt;
}

// Of those with anything that has ended.
std::optional<ContainerRoom::Id> ContainerRoom::_oldestOfWhoHasMost(bool ofBytes) const {
  std::optional<Id> oldest;
  std::uint64_t most = 0;
  for (const auto& [order, id] : ended_) {
    const auto& container = containers_.at(id);
    if (container.kind != SessionKind::OneOff) continue;
    const auto held = _heldBy(container.holder);
    const auto amount = ofBytes ? held.bytes : held.files;
    if (amount <= most) continue;
    most = amount;
    oldest = id;
  }
  return oldest;
}

ContainerRoom::Id ContainerRoom::_add(Container container) {
  ++inAll_.files;
  if (container.kind == SessionKind::OneOff) _countOneOffFile(container, true);
  _count(container, container.bytes, true);
  containers_.emplace(++lastId_, std::move(container));
  return lastId_;
}

void ContainerRoom::_count(const Container& container, std::uint64_t bytes, bool isMore) {
  const auto change = isMore ? bytes : std::uint64_t{0} - bytes;
  inAll_.bytes += change;
  if (container.kind == SessionKind::Managed) return;
  ofOneOff_.bytes += change;
  ofHolders_[container.holder].bytes += change;
}

void ContainerRoom::_countOneOffFile(const Container& container, bool isMore) {
  const auto change = isMore ? std::uint64_t{1} : std::uint64_t{0} - 1;
  ofOneOff_.files += change;
  const auto held = ofHolders_.try_emplace(container.holder).first;
  held->second.files += change;
  if (held->second.files == 0) ofHolders_.erase(held);
}

void ContainerRoom::_drop(Containers::iterator place) {
  const auto& container = place->second;
  --inAll_.files;
  _count(container, container.bytes, false);
  if (container.kind == SessionKind::OneOff) _countOneOffFile(container, false);
  if (container.ended) ended_.erase(*container.ended);
  containers_.erase(place);
}

void ContainerRoom::_finish(const Container& whose, const std::vector<std::string>& gone,
                            bool fits) {
  const std::string holder = whose.kind == SessionKind::OneOff ? whose.holder : "sessions";
  for (const auto& path : gone) {
    log_.info("delete file url {}", path);
    if (files_.remove(path)) log_.error("File {} delete failed", path);
  }
  if (!gone.empty()) limits_.refused("containers", holder, gone.size());
  if (!fits) limits_.refused("containers_full", holder);
}

}  // namespace zelkord
