#include "platform/linux/url_cache/CachingURLSession.h"

#include <utility>

#include "platform/linux/url_cache/CacheRules.h"
#include "platform/linux/url_cache/CachingURLTask.h"
#include "platform/linux/url_cache/ResponseKeeping.h"

namespace zelkord {

CachingURLSession::CachingURLSession(std::shared_ptr<CurlURLSession> network,
                                     std::shared_ptr<DelegateQueue> delegateQueue,
                                     std::shared_ptr<LinuxURLCache> cache,
                                     std::string identityHeader)
    : network_(std::move(network)),
      delegateQueue_(std::move(delegateQueue)),
      cache_(std::move(cache)),
      identityHeader_(std::move(identityHeader)) {}

std::shared_ptr<URLTask> CachingURLSession::dataTask(URLRequest request, URLCompletion completion) {
  const auto endings = network_->endings();
  const auto scope = _scopeOf(request);
  if (isUnsafeMethod(request)) {
    return _unsafeTask(scope, std::move(request), std::move(completion));
  }
  const auto use = cacheUseOf(request);
  if (use == CacheUse::None) return network_->dataTask(std::move(request), std::move(completion));
  if (use == CacheUse::StoreOnly || !cache_->mayHave(scope, request.url)) {
    return _plainTask(scope, std::move(request), std::move(completion));
  }
  return std::make_shared<CachingURLTask>(weak_from_this(), delegateQueue_,
                                          CachingURLTask::Origin{scope, endings},
                                          std::move(request), std::move(completion));
}

std::shared_ptr<URLTask> CachingURLSession::downloadTask(URLRequest request,
                                                         URLCompletion completion) {
  return network_->downloadTask(std::move(request), std::move(completion));
}

CacheScopes::Scope CachingURLSession::_scopeOf(const URLRequest& request) {
  const auto identity = identityHeader_.empty() ? std::nullopt : request.header(identityHeader_);
  return cache_->scopeOf(identity.value_or(""));
}

void CachingURLSession::endIdentity(const std::string& identity) {
  cache_->endIdentity(identity);
  network_->endIdentity(identity);
}

std::shared_ptr<URLTask> CachingURLSession::_plainTask(CacheScopes::Scope scope, URLRequest request,
                                                       URLCompletion completion) {
  auto keeping = [cache = cache_, scope, requestedAt = cache_->now(),
                  completion = std::move(completion)](const std::shared_ptr<URLTask>& task,
                                                      const URLResult& result) {
    keepIfAllowed(*cache, scope, *task, result, requestedAt);
    completion(task, result);
  };
  return network_->dataTask(std::move(request), std::move(keeping));
}

std::shared_ptr<URLTask> CachingURLSession::_unsafeTask(CacheScopes::Scope scope,
                                                        URLRequest request,
                                                        URLCompletion completion) {
  auto forgetting = [cache = cache_, scope, url = request.url, completion = std::move(completion)](
                        const std::shared_ptr<URLTask>& task, const URLResult& result) {
    if (changesResource(result)) {
      cache->forget(scope, url);
      cache->forget(scope, task->currentRequest().url);
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
