#include "platform/linux/url_cache/LinuxURLCache.h"

#include <algorithm>
#include <utility>

#include "platform/linux/url_cache/CacheRules.h"
#include "platform/linux/url_cache/CacheVary.h"

namespace zelkord {
namespace {

CachedResponse cachedFor(const URLRequest& request, const StoredResponse& stored) {
  CachedResponse cached{stored.response, stored.body};
  cached.response.url = request.url;
  return cached;
}

}  // namespace

LinuxURLCache::LinuxURLCache(const Host& host, const URLSessionConfiguration::Cache& limits)
    : clock_(host.clock),
      maximumOnDisk_(std::min(limits.diskBytes / 10, BodyFiles::kMaximumSize)),
      index_(limits.diskBytes),
      memory_(limits.memoryBytes),
      disk_(host.folder, limits.minimumMappedBytes, Logger(host.log, "")),
      queue_(host.queues.makeSerialQueue("URLCache")) {}

LinuxURLCache::~LinuxURLCache() {
  if (queue_->isCurrent()) {
    _write();
  } else {
    queue_->sync([this] { _write(); });
  }
}

bool LinuxURLCache::_isOpen() {
  const MutexLock lock(mutex_);
  return open_;
}

void LinuxURLCache::_makeSureItIsOpen() {
  if (!_isOpen()) queue_->sync([this] { _open(); });
}

void LinuxURLCache::_open() {
  queue_->assertCurrent();
  if (_isOpen()) return;
  auto entries = disk_.load();
  knownResets_ = disk_.resets();
  queue_->async([this] { _removeOrphans(); });
  const MutexLock lock(mutex_);
  for (const auto& entry : entries) {
    if (entry.scope != CacheScopes::kByHand) removed_.push_back(entry.id);
  }
  erases_ = !removed_.empty();
  if (erases_) _scheduleWrite();
  // All of them: their ids are not given out again.
  for (const auto id : index_.load(std::move(entries))) removed_.push_back(id);
  for (const auto id : removed_) index_.remove(id);
  open_ = true;
}

void LinuxURLCache::_removeOrphans() {
  queue_->assertCurrent();
  disk_.removeOrphans([this](std::int64_t id) {
    const MutexLock lock(mutex_);
    return index_.has(id);
  });
}

LinuxURLCache::Place LinuxURLCache::_locate(const Digest& key, const URLRequest& request) {
  const MutexLock lock(mutex_);
  const auto* const entry = index_.find(key, request);
  if (!entry) return {};
  if (auto stored = memory_.find(entry->id)) return {std::move(stored), {}};
  if (const auto found = waiting_.find(entry->id); found != waiting_.end()) {
    return {found->second.record.stored, {}};
  }
  return {nullptr, *entry};
}

StoredPointer LinuxURLCache::_readFromDisk(const CacheEntry& entry) {
  queue_->assertCurrent();
  auto stored = disk_.read(entry);
  _forgetAllAfterReset();
  const MutexLock lock(mutex_);
  // Replaced, evicted or purged meanwhile: what was read is still right.
  if (!index_.has(entry.id)) return stored;
  if (stored) {
    memory_.put(entry.id, stored);
  } else {
    _drop(entry.id);
    _scheduleWrite();
  }
  return stored;
}

std::optional<CachedResponse> LinuxURLCache::lookup(const URLRequest& request) {
  _makeSureItIsOpen();
  auto place = _locate(cacheKeyOf(request.url), request);
  if (place.entry) queue_->sync([&] { place.stored = _readFromDisk(*place.entry); });
  return place.stored ? std::optional(cachedFor(request, *place.stored)) : std::nullopt;
}

void LinuxURLCache::store(const URLRequest& request, CachedResponse response) {
  _makeSureItIsOpen();
  const auto key = cacheKeyOf(request.url);
  response.response.url.clear();
  const auto now = clock_.wallNow();
  _add(CacheScopes::kByHand, key, request,
       std::make_shared<const StoredResponse>(
           StoredResponse{std::move(response.response), std::move(response.data), now, now}));
}

CacheScopes::Scope LinuxURLCache::scopeOf(const std::string& identity) {
  const MutexLock lock(mutex_);
  return scopes_.of(identity);
}

void LinuxURLCache::endIdentity(const std::string& identity) {
  const MutexLock lock(mutex_);
  for (const auto scope : scopes_.end(identity)) {
    const auto gone = index_.removeScope(scope);
    _dropAll(gone);
    erases_ = erases_ || !gone.empty();
  }
}

bool LinuxURLCache::mayHave(CacheScopes::Scope scope, const std::string& url) {
  {
    const MutexLock lock(mutex_);
    if (!open_) {
      if (!std::exchange(opening_, true)) queue_->async([this] { _open(); });
      return true;
    }
    if (index_.empty()) return false;
  }
  const auto key = cacheKeyOf(url, scope);
  const MutexLock lock(mutex_);
  return index_.hasURL(key);
}

void LinuxURLCache::find(CacheScopes::Scope scope, const URLRequest& request, Found found) {
  if (!_isOpen()) {
    queue_->async([this, scope, request, found = std::move(found)]() mutable {
      _open();
      find(scope, request, std::move(found));
    });
    return;
  }
  auto place = _locate(cacheKeyOf(request.url, scope), request);
  if (!place.entry) return found(std::move(place.stored));
  // The callback may be the last to hold the session, and with it this cache.
  queue_->async([this, entry = *std::move(place.entry), found = std::move(found)] {
    auto stored = _readFromDisk(entry);
    found(std::move(stored));
  });
}

void LinuxURLCache::keep(CacheScopes::Scope scope, const URLRequest& request,
                         StoredResponse response) {
  auto stored = std::make_shared<const StoredResponse>(std::move(response));
  const auto key = cacheKeyOf(request.url, scope);
  if (_isOpen()) return _add(scope, key, request, std::move(stored));
  queue_->async([this, scope, key, request, stored = std::move(stored)] {
    _open();
    _add(scope, key, request, stored);
  });
}

void LinuxURLCache::_add(CacheScopes::Scope scope, const Digest& key, const URLRequest& request,
                         StoredPointer stored) {
  auto vary = varyNames(stored->response);
  if (!vary) return;
  const auto variant = variantOf(*vary, request);
  CacheEntry entry{.url = key,
                   .vary = *std::move(vary),
                   .variant = variant,
                   .cost = costOf(*stored),
                   .scope = scope};
  const bool goesToDisk = entry.cost <= maximumOnDisk_;
  const MutexLock lock(mutex_);
  // Ended while the response was on its way.
  if (scope != CacheScopes::kByHand && !scopes_.isLive(scope)) return;
  for (const auto id : index_.add(entry)) _drop(id);
  memory_.put(entry.id, stored);
  if (goesToDisk) {
    waiting_.emplace(entry.id, Waiting{{entry, std::move(stored)}});
  } else {
    _notOnDisk(entry.id);
  }
  _scheduleWrite();
}

void LinuxURLCache::_notOnDisk(std::int64_t id) {
  if (!memory_.has(id)) {
    index_.remove(id);
    std::erase(removed_, id);  // dropped while it was being written
  } else {
    memoryOnly_.insert(id);
  }
}

// What never was on disk is not to be removed from it: the list would grow for as long as nothing
// can be written.
void LinuxURLCache::_drop(std::int64_t id) {
  index_.remove(id);
  memory_.remove(id);
  if (memoryOnly_.erase(id) > 0) return;
  const auto found = waiting_.find(id);
  if (found != waiting_.end() && !found->second.beingWritten) {
    waiting_.erase(found);
  } else {
    removed_.push_back(id);
  }
}

void LinuxURLCache::forget(CacheScopes::Scope scope, const std::string& url) {
  if (!_isOpen()) {
    queue_->async([this, scope, url] {
      _open();
      forget(scope, url);
    });
    return;
  }
  const auto ofTasks = cacheKeyOf(url, scope), byHand = cacheKeyOf(url);
  const MutexLock lock(mutex_);
  _dropAll(index_.removeURL(ofTasks));
  _dropAll(index_.removeURL(byHand));
}

void LinuxURLCache::_dropAll(const CacheIndex::Ids& ids) {
  for (const auto id : ids) _drop(id);
  if (!ids.empty()) _scheduleWrite();
}

void LinuxURLCache::purgeMemory() {
  const MutexLock lock(mutex_);
  memory_.clear();
}

void LinuxURLCache::_scheduleWrite() {
  if (!std::exchange(writeScheduled_, true)) queue_->async([this] { _write(); });
}

DiskPart::Changes LinuxURLCache::_takeChanges() {
  DiskPart::Changes changes;
  const MutexLock lock(mutex_);
  writeScheduled_ = false;
  for (auto& [id, waiting] : waiting_) {
    waiting.beingWritten = true;
    changes.added.push_back(waiting.record);
  }
  changes.removed = std::exchange(removed_, {});
  changes.used = index_.takeUses();
  changes.erases = std::exchange(erases_, false);
  return changes;
}

void LinuxURLCache::_write() {
  queue_->assertCurrent();
  const auto changes = _takeChanges();
  if (changes.added.empty() && changes.removed.empty() && changes.used.empty()) return;
  const auto outcome = disk_.write(changes);
  _settle(changes, outcome);
  _forgetAllAfterReset();
}

void LinuxURLCache::_settle(const DiskPart::Changes& changes, const DiskPart::Outcome& outcome) {
  const MutexLock lock(mutex_);
  for (const auto& record : changes.added) waiting_.erase(record.entry.id);
  for (const auto id : outcome.notAdded) _notOnDisk(id);
  // Tried again with what is written next.
  if (!outcome.removedRows) {
    removed_.insert(removed_.end(), changes.removed.begin(), changes.removed.end());
    erases_ = erases_ || changes.erases;
  }
}

void LinuxURLCache::_forgetAllAfterReset() {
  queue_->assertCurrent();
  if (std::exchange(knownResets_, disk_.resets()) == disk_.resets()) return;
  const MutexLock lock(mutex_);
  index_.clear();
  memory_.clear();
  waiting_.clear();
  memoryOnly_.clear();
  removed_.clear();
}

}  // namespace zelkord
