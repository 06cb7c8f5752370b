#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>

#include "base/Mutex.h"
#include "platform/api/URLSession.h"
#include "platform/linux/url/DelegateQueue.h"
#include "platform/linux/url_cache/CacheScopes.h"
#include "platform/linux/url_cache/StoredResponse.h"

namespace zelkord {

class CachingURLSession;

// A task for whose URL something may be kept.
//
// States: suspended; looking (the cache may be asking the disk); then either finished (a fresh
// response, or a cancellation, waits on the delegate queue) or loading (a task of the network
// session, which asks whether the kept response is still right when that can be asked); completed.
// A loading task whose 304 does not speak of the kept response loads once more, without conditions.
//
// Threading: any thread, except for the operations marked otherwise.
// Ownership: the session holds a loading task, the cache or the delegate queue one that is looking
// or finished. A task whose session is gone never completes.
class CachingURLTask final : public URLTask, public std::enable_shared_from_this<CachingURLTask> {
 public:
  // As things were when it was made.
  struct Origin {
    CacheScopes::Scope scope = CacheScopes::kEnded;
    std::uint64_t endings = 0;  // CurlURLSession::endings
  };

  CachingURLTask(std::weak_ptr<CachingURLSession> session,
                 std::shared_ptr<DelegateQueue> delegateQueue, Origin origin, URLRequest request,
                 URLCompletion completion);

  // URLTask
  void resume() override;
  void cancel() override;
  URLRequest currentRequest() const override;
  TimingData timingData() const override;
  bool enableProxy(Error* error) override;
  void connectionInformation(std::function<void(std::optional<json::object>)> completion) override;

 private:
  enum class State { Suspended, Looking, Loading, Finished, Completed };
  enum class Next { Load, Complete, Nothing };

  // Where it looked: any thread.
  void _found(StoredPointer stored);
  void _load(CachingURLSession& session, StoredPointer stored);
  Next _beginLoading(std::shared_ptr<URLTask> loader, StoredPointer stored, WallTime now);
  std::shared_ptr<URLTask> _makeLoader(CachingURLSession& session, const URLRequest& request);
  void _finish(URLResult result);
  std::shared_ptr<URLTask> _loader() const;
  bool _isConditional() const;

  // The delegate queue.
  void _loaded(const URLResult& result);
  bool _settle304(CachingURLSession& session, const URLResult& result);
  void _complete(const URLResult& result);

  // Fixed after construction.
  const std::weak_ptr<CachingURLSession> session_;
  const std::shared_ptr<DelegateQueue> delegateQueue_;
  const Origin origin_;
  const URLRequest request_;

  mutable Mutex mutex_;
  State state_ ZK_GUARDED_BY(mutex_) = State::Suspended;
  bool cancelRequested_ ZK_GUARDED_BY(mutex_) = false;
  bool proxyEnabled_ ZK_GUARDED_BY(mutex_) = false;
  URLCompletion completion_ ZK_GUARDED_BY(mutex_);
  // The network session's task; a suspended one when the proxy was enabled first.
  std::shared_ptr<URLTask> loader_ ZK_GUARDED_BY(mutex_);
  StoredPointer asked_ ZK_GUARDED_BY(mutex_);  // what the loading task asks about; null: nothing
  WallTime requestedAt_ ZK_GUARDED_BY(mutex_){};
};

}  // namespace zelkord
