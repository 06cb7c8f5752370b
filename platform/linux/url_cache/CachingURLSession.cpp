#include "platform/linux/url_cache/CachingURLSession.h"

#include <utility>

#include "platform/linux/url_cache/CacheRules.h"
#include "platform/linux/url_cache/CachingURLTask.h"
#include "platform/linux/url_cache/ResponseKeeping.h"

namespace zelkord {

CachingURLSession::CachingURLSession(std::shared_ptr<URLSession> network,
                                     std::shared_ptr<DelegateQueue> delegateQueue,
                                     std::shared_ptr<LinuxURLCache> cache)
    : network_(std::move(network)),
      delegateQueue_(std::move(delegateQueue)),
      cache_(std::move(cache)) {}

std::shared_ptr<URLTask> CachingURLSession::dataTask(URLRequest request, URLCompletion completion) {
  if (isUnsafeMethod(request)) return _unsafeTask(std::move(request), std::move(completion));
  const auto use = cacheUseOf(request);
  if (use == CacheUse::None) return network_->dataTask(std::move(request), std::move(completion));
  if (use == CacheUse::StoreOnly || !cache_->mayHave(request.url)) {
    return _plainTask(std::move(request), std::move(completion));
  }
  return std::make_shared<CachingURLTask>(weak_from_this(), delegateQueue_, std::move(request),
                                          std::move(completion));
}

std::shared_ptr<URLTask> CachingURLSession::downloadTask(URLRequest request,
                                                         URLCompletion completion) {
  return network_->downloadTask(std::move(request), std::move(completion));
}

std::shared_ptr<URLTask> CachingURLSession::_plainTask(URLRequest request,
                                                       URLCompletion completion) {
  auto keeping = [cache = cache_, requestedAt = cache_->now(), completion = std::move(completion)](
                     const std::shared_ptr<URLTask>& task, const URLResult& result) {
    keepIfAllowed(*cache, *task, result, requestedAt);
    completion(task, result);
  };
  return network_->dataTask(std::move(request), std::move(keeping));
}

std::shared_ptr<URLTask> CachingURLSession::_unsafeTask(URLRequest request,
                                                        URLCompletion completion) {
  auto forgetting = [cache = cache_, url = request.url, completion = std::move(completion)](
                        const std::shared_ptr<URLTask>& task, const URLResult& result) {
    if (changesResource(result)) {
      cache->forget(url);
      cache->forget(task->currentRequest().url);
    }
    completion(task, result);
  };
  return network_->dataTask(std::move(request), std::move(forgetting));
}

void CachingURLSession::hold(const std::shared_ptr<CachingURLTask>& task) {
  const MutexLock lock(mutex_);
  held_.insert(task);
}

void CachingURLSession::release(const std::shared_ptr<CachingURLTask>& task) {
  const MutexLock lock(mutex_);
  held_.erase(task);
}

}  // namespace zelkord
