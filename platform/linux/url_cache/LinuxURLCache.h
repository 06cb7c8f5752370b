#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <unordered_set>

#include "base/Mutex.h"
#include "platform/api/Clock.h"
#include "platform/api/Log.h"
#include "platform/api/URLCache.h"
#include "platform/api/URLSession.h"
#include "platform/api/WorkQueues.h"
#include "platform/linux/url_cache/CacheIndex.h"
#include "platform/linux/url_cache/CacheScopes.h"
#include "platform/linux/url_cache/DiskPart.h"
#include "platform/linux/url_cache/MemoryPart.h"

namespace zelkord {

// The URL cache: responses in memory, as many as fit, and on disk.
//
// What tasks keep is apart for each scope (CacheScopes) and from what is stored by hand. No scope
// outlives the process: what an earlier one left in any is removed when the cache opens.
//
// What is stored is found at once. It is written soon after, many responses in one transaction; a
// response over a tenth of the disk part is not written. The rules of HTTP are its user's.
//
// States: unopened, when nothing is known of the disk and no file is open; open, from the first use
// on, with the index of all that is on disk in memory.
//
// Threading: any thread. The index and what is in memory have a mutex of their own, the disk
// belongs to a queue. `lookup` and `store` wait for the disk where they must; the rest never does.
// Ownership: the queues, the clock and the log outlive it. Its end writes what waits to be written.
// Errors: none. What cannot be written is not kept, and what was damaged is not found.
class LinuxURLCache final : public URLCache {
 public:
  struct Host {
    WorkQueues& queues;
    const Clock& clock;
    LogSink& log;
    std::string folder;  // its own; its parent is there
  };
  using Found = std::function<void(StoredPointer stored)>;

  LinuxURLCache(const Host& host, const URLSessionConfiguration::Cache& limits);
  ~LinuxURLCache() override;
  LinuxURLCache(const LinuxURLCache&) = delete;
  LinuxURLCache& operator=(const LinuxURLCache&) = delete;

  // URLCache
  std::optional<CachedResponse> lookup(const URLRequest& request) override;
  void store(const URLRequest& request, CachedResponse response) override;

  // The rest is for tasks. A scope that has ended has nothing, and takes nothing.
  CacheScopes::Scope scopeOf(const std::string& identity);
  void endIdentity(const std::string& identity);
  // False when nothing is kept for the URL. True also while nobody knows; then the cache opens.
  bool mayHave(CacheScopes::Scope scope, const std::string& url);
  // Calls back with what is kept for the request, or null: at once when that needs no disk, else on
  // the cache's queue, unless the cache ends before.
  void find(CacheScopes::Scope scope, const URLRequest& request, Found found);
  void keep(CacheScopes::Scope scope, const URLRequest& request, StoredResponse response);
  // Drops all that is kept for the URL in the scope or by hand.
  void forget(CacheScopes::Scope scope, const std::string& url);
  void purgeMemory();

  WallTime now() const { return clock_.wallNow(); }

 private:
  struct Waiting {
    CacheRecord record;
    bool beingWritten = false;
  };
  // Where a request's response is.
  struct Place {
    StoredPointer stored;             // in memory
    std::optional<CacheEntry> entry;  // else on disk; none: nowhere
  };

  bool _isOpen();
  void _open();
  void _makeSureItIsOpen();
  Place _locate(const Digest& key, const URLRequest& request);
  StoredPointer _readFromDisk(const CacheEntry& entry);
  void _add(CacheScopes::Scope scope, const Digest& key, const URLRequest& request,
            StoredPointer stored);
  void _dropAll(const CacheIndex::Ids& ids) ZK_REQUIRES(mutex_);
  void _drop(std::int64_t id) ZK_REQUIRES(mutex_);
  void _scheduleWrite() ZK_REQUIRES(mutex_);
  void _write();
  DiskPart::Changes _takeChanges();
  void _notOnDisk(std::int64_t id) ZK_REQUIRES(mutex_);
  void _settle(const DiskPart::Changes& changes, const DiskPart::Outcome& outcome);
  void _forgetAllAfterReset();
  void _removeOrphans();

  // Fixed after construction.
  const Clock& clock_;
  const std::uint64_t maximumOnDisk_;  // bytes of one response

  mutable Mutex mutex_;
  bool open_ ZK_GUARDED_BY(mutex_) = false;
  bool opening_ ZK_GUARDED_BY(mutex_) = false;
  CacheScopes scopes_ ZK_GUARDED_BY(mutex_);
  CacheIndex index_ ZK_GUARDED_BY(mutex_);
  MemoryPart memory_ ZK_GUARDED_BY(mutex_);
  std::map<std::int64_t, Waiting> waiting_ ZK_GUARDED_BY(mutex_);  // to be written
  // Held in memory only: they could not be written, or are too large for it.
  std::unordered_set<std::int64_t> memoryOnly_ ZK_GUARDED_BY(mutex_);
  CacheIndex::Ids removed_ ZK_GUARDED_BY(mutex_);  // from the disk, as soon as may be
  bool erases_ ZK_GUARDED_BY(mutex_) = false;      // with the next write
  bool writeScheduled_ ZK_GUARDED_BY(mutex_) = false;

  // Queue state.
  DiskPart disk_ ZK_ON(queue_);
  unsigned knownResets_ ZK_ON(queue_) = 0;

  // The first to go: what still runs on it needs the rest.
  const std::unique_ptr<SerialQueue> queue_;
};

}  // namespace zelkord
