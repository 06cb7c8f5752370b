#pragma once

#include <memory>
#include <string>
#include <unordered_set>

#include "base/Mutex.h"
#include "platform/api/URLSession.h"
#include "platform/linux/url/CurlURLSession.h"
#include "platform/linux/url/DelegateQueue.h"
#include "platform/linux/url_cache/LinuxURLCache.h"

namespace zelkord {

class CachingURLTask;

// A session with a URL cache, in front of one that loads from the network.
//
// Most requests find nothing and leave nothing: those become tasks of the network session as they
// are, for the price of a look into the cache's index. The others are CachingURLTasks.
//
// Threading: any thread; nothing waits for the disk. Ownership: shares the cache; its end drops the
// tasks under way, whose completions then never run.
class CachingURLSession final : public URLSession,
                                public std::enable_shared_from_this<CachingURLSession> {
 public:
  // `delegateQueue` is the one on which the network session's completions run, `identityHeader`
  // the network session's, too.
  CachingURLSession(std::shared_ptr<CurlURLSession> network,
                    std::shared_ptr<DelegateQueue> delegateQueue,
                    std::shared_ptr<LinuxURLCache> cache, std::string identityHeader);

  // URLSession
  std::shared_ptr<URLTask> dataTask(URLRequest request, URLCompletion completion) override;
  std::shared_ptr<URLTask> downloadTask(URLRequest request, URLCompletion completion) override;
  URLCache* cache() override { return cache_.get(); }
  void purgeMemoryCache() override { cache_->purgeMemory(); }
  void endIdentity(const std::string& identity) override;

  // For its tasks.
  CurlURLSession& network() { return *network_; }
  LinuxURLCache& responses() { return *cache_; }
  void hold(const std::shared_ptr<CachingURLTask>& task);
  void release(const std::shared_ptr<CachingURLTask>& task);

 private:
  std::shared_ptr<URLTask> _unsafeTask(CacheScopes::Scope scope, URLRequest request,
                                       URLCompletion completion);
  std::shared_ptr<URLTask> _plainTask(CacheScopes::Scope scope, URLRequest request,
                                      URLCompletion completion);
  CacheScopes::Scope _scopeOf(const URLRequest& request);

  // Fixed after construction.
  const std::shared_ptr<CurlURLSession> network_;
  const std::shared_ptr<DelegateQueue> delegateQueue_;
  const std::shared_ptr<LinuxURLCache> cache_;
  const std::string identityHeader_;

  Mutex mutex_;
  std::unordered_set<std::shared_ptr<CachingURLTask>> held_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
