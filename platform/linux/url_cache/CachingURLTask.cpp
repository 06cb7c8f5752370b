#include "platform/linux/url_cache/CachingURLTask.h"

#include <utility>

#include "platform/linux/url_cache/CacheFreshness.h"
#include "platform/linux/url_cache/CacheRules.h"
#include "platform/linux/url_cache/CacheValidation.h"
#include "platform/linux/url_cache/CachingURLSession.h"
#include "platform/linux/url_cache/ResponseKeeping.h"

namespace zelkord {
namespace {

constexpr int kNotModified = 304;

}  // namespace

CachingURLTask::CachingURLTask(std::weak_ptr<CachingURLSession> session,
                               std::shared_ptr<DelegateQueue> delegateQueue, Origin origin,
                               URLRequest request, URLCompletion completion)
    : session_(std::move(session)),
      delegateQueue_(std::move(delegateQueue)),
      origin_(origin),
      request_(std::move(request)),
      completion_(std::move(completion)) {}

void CachingURLTask::resume() {
  const auto session = session_.lock();
  if (!session) return;
  {
    const MutexLock lock(mutex_);
    if (state_ != State::Suspended) return;
    state_ = State::Looking;
  }
  session->responses().find(
      origin_.scope, request_,
      [self = shared_from_this()](StoredPointer stored) { self->_found(std::move(stored)); });
}

void CachingURLTask::_found(StoredPointer stored) {
  const auto session = session_.lock();
  if (!session) return;
  if (stored && !mayAnswerTasks(*stored)) stored = nullptr;
  const auto now = session->responses().now();
  if (stored && isFresh(*stored, now, requestDirectives(request_))) {
    return _finish(answerFromCache(request_, *stored, now));
  }
  if (stored && !hasValidator(stored->response)) stored = nullptr;
  _load(*session, std::move(stored));
}

void CachingURLTask::_load(CachingURLSession& session, StoredPointer stored) {
  const auto self = shared_from_this();
  const auto loader =
      _makeLoader(session, stored ? conditionalRequest(request_, *stored) : request_);
  session.hold(self);
  const auto next = _beginLoading(loader, std::move(stored), session.responses().now());
  if (next == Next::Load) return loader->resume();
  session.release(self);
  if (next == Next::Complete) _complete({});
}

CachingURLTask::Next CachingURLTask::_beginLoading(std::shared_ptr<URLTask> loader,
                                                   StoredPointer stored, WallTime now) {
  const MutexLock lock(mutex_);
  if (state_ == State::Finished || state_ == State::Completed) return Next::Nothing;
  // Cancelled after the loader before.
  if (state_ == State::Loading && cancelRequested_) return Next::Complete;
  loader_ = std::move(loader);
  asked_ = std::move(stored);
  requestedAt_ = now;
  state_ = State::Loading;
  return Next::Load;
}

// The completion knows the task weakly: the task holds the loader.
std::shared_ptr<URLTask> CachingURLTask::_makeLoader(CachingURLSession& session,
                                                     const URLRequest& request) {
  auto loader = session.network().dataTask(
      request,
      [weak = weak_from_this()](const std::shared_ptr<URLTask>&, const URLResult& result) {
        if (const auto self = weak.lock()) self->_loaded(result);
      },
      origin_.endings);
  bool proxyEnabled = false;
  {
    const MutexLock lock(mutex_);
    proxyEnabled = proxyEnabled_;
  }
  if (proxyEnabled) loader->enableProxy(nullptr);
  return loader;
}

void CachingURLTask::_loaded(const URLResult& result) {
  const auto session = session_.lock();
  if (!session) return;
  if (!result.error && result.status() == kNotModified && _isConditional()) {
    if (_settle304(*session, result)) return;
    session->responses().forget(origin_.scope, request_.url);
    return _load(*session, nullptr);
  }
  WallTime requestedAt;
  {
    const MutexLock lock(mutex_);
    requestedAt = requestedAt_;
  }
  const bool kept =
      keepIfAllowed(session->responses(), origin_.scope, *_loader(), result, requestedAt);
  const bool isElsewhere = _loader()->currentRequest().url != request_.url;
  // What came is newer than what was kept, unless the server has failed.
  const bool isNews = !result.error && result.status() < 500;
  if (isNews && (!kept || isElsewhere)) session->responses().forget(origin_.scope, request_.url);
  _complete(result);
}

bool CachingURLTask::_settle304(CachingURLSession& session, const URLResult& result) {
  auto& responses = session.responses();
  const auto now = responses.now();
  StoredPointer asked;
  WallTime requestedAt;
  {
    const MutexLock lock(mutex_);
    asked = asked_;
    requestedAt = requestedAt_;
  }
  // After a redirect somebody else has answered.
  const bool isOurs = _loader()->currentRequest().url == request_.url;
  if (!isOurs || !confirms(*result.response, *asked)) return false;
  auto fresh = freshened(*asked, *result.response, requestedAt, now);
  const auto answer = answerFromCache(request_, fresh, now);
  if (mayBeStored(result, fresh)) {
    responses.keep(origin_.scope, request_, std::move(fresh));
  } else {
    responses.forget(origin_.scope, request_.url);
  }
  _complete(answer);
  return true;
}

void CachingURLTask::cancel() {
  State state;
  {
    const MutexLock lock(mutex_);
    cancelRequested_ = true;
    state = state_;
  }
  if (state == State::Loading) return _loader()->cancel();
  if (state == State::Suspended || state == State::Looking) _finish({});
}

void CachingURLTask::_finish(URLResult result) {
  {
    const MutexLock lock(mutex_);
    // The first end counts; what is loading already ends by itself.
    if (state_ != State::Suspended && state_ != State::Looking) {
      if (state_ == State::Loading && loader_) loader_->cancel();
      return;
    }
    state_ = State::Finished;
  }
  delegateQueue_->async(
      [self = shared_from_this(), result = std::move(result)] { self->_complete(result); });
}

void CachingURLTask::_complete(const URLResult& result) {
  URLCompletion completion;
  bool cancelled = false;
  {
    const MutexLock lock(mutex_);
    state_ = State::Completed;
    cancelled = cancelRequested_;
    completion = std::exchange(completion_, nullptr);
    asked_ = nullptr;
  }
  const auto self = shared_from_this();
  if (const auto session = session_.lock()) session->release(self);
  if (!completion) return;
  if (!cancelled) return completion(self, result);
  completion(self, {.error = urlError(URLErrorCode::Cancelled, "cancelled")});
}

std::shared_ptr<URLTask> CachingURLTask::_loader() const {
  const MutexLock lock(mutex_);
  return loader_;
}

bool CachingURLTask::_isConditional() const {
  const MutexLock lock(mutex_);
  return asked_ != nullptr;
}

URLRequest CachingURLTask::currentRequest() const {
  const auto loader = _loader();
  return loader ? unconditionalRequest(loader->currentRequest()) : request_;
}

TimingData CachingURLTask::timingData() const {
  const auto loader = _loader();
  return loader ? loader->timingData() : TimingData();
}

bool CachingURLTask::enableProxy(Error* error) {
  if (!request_.routed) return true;
  const auto session = session_.lock();
  auto loader = _loader();
  if (!loader && session) loader = _makeLoader(*session, request_);
  if (loader && !loader->enableProxy(error)) return false;
  const MutexLock lock(mutex_);
  if (state_ != State::Suspended) return true;
  loader_ = std::move(loader);
  proxyEnabled_ = true;
  return true;
}

void CachingURLTask::connectionInformation(
    std::function<void(std::optional<json::object>)> completion) {
  if (const auto loader = _loader()) return loader->connectionInformation(std::move(completion));
  delegateQueue_->async([completion = std::move(completion)] { completion(std::nullopt); });
}

}  // namespace zelkord
