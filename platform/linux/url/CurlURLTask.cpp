#include "platform/linux/url/CurlURLTask.h"

#include <utility>

#include "platform/linux/loop/Loop.h"
#include "platform/linux/url/CurlURLSession.h"
#include "platform/linux/url/RequestPolicy.h"
#include "platform/linux/url/URLParts.h"

namespace zelkord {

CurlURLTask::CurlURLTask(std::weak_ptr<CurlURLSession> session,
                         std::shared_ptr<DelegateQueue> delegateQueue, Order order,
                         URLCompletion completion)
    : session_(std::move(session)),
      delegateQueue_(std::move(delegateQueue)),
      order_(std::move(order)),
      completion_(std::move(completion)) {}

void CurlURLTask::resume() {
  const auto session = session_.lock();
  if (!session) return;
  const std::uint64_t maximumBody = session->maximumResponseSize();
  std::shared_ptr<const URLRequest> request;
  {
    const MutexLock lock(mutex_);
    if (state_ != State::Suspended) return;
    state_ = State::Running;
    order_.resumedAt = steadyNow();
    order_.maximumBody = maximumBody;
    request = order_.request;
  }
  if (auto refusal = refusalOf(*request)) return finish({.error = std::move(refusal)});
  session->begin(shared_from_this());
}

void CurlURLTask::cancel() {
  State state;
  {
    const MutexLock lock(mutex_);
    cancelRequested_ = true;
    state = state_;
  }
  if (state == State::Suspended) return finish({});
  if (state != State::Running) return;
  if (const auto session = session_.lock()) session->cancel(shared_from_this());
}

void CurlURLTask::finish(URLResult result, TimingData timing,
                         std::optional<json::object> connectionInformation) {
  {
    const MutexLock lock(mutex_);
    if (state_ == State::Finished || state_ == State::Completed) return;
    state_ = State::Finished;
    result_ = std::move(result);
    timing_ = std::move(timing);
    connectionInformation_ = std::move(connectionInformation);
  }
  delegateQueue_->async([self = shared_from_this()] { self->_complete(); });
}

void CurlURLTask::_complete() {
  URLCompletion completion;
  URLResult result;
  {
    const MutexLock lock(mutex_);
    state_ = State::Completed;
    completion = std::exchange(completion_, nullptr);
    result = std::exchange(result_, {});
    if (cancelRequested_) result = {.error = urlError(URLErrorCode::Cancelled, "cancelled")};
  }
  if (completion) completion(shared_from_this(), result);
}

bool CurlURLTask::enableProxy(Error* error) {
  if (!_request()->routed) return true;
  const auto session = session_.lock();
  auto configuration = session ? session->proxyConfiguration() : nullptr;
  const auto parts = configuration ? parseURL(configuration->proxy) : std::nullopt;
  if (!parts || (parts->scheme != "http" && parts->scheme != "https")) {
    if (error) *error = urlError(URLErrorCode::CannotConnect, "no usable network proxy");
    return false;
  }
  const MutexLock lock(mutex_);
  if (state_ == State::Suspended) order_.proxy = std::move(configuration);
  return true;
}

void CurlURLTask::connectionInformation(
    std::function<void(std::optional<json::object>)> completion) {
  delegateQueue_->async([self = shared_from_this(), completion = std::move(completion)] {
    std::optional<json::object> information;
    {
      const MutexLock lock(self->mutex_);
      information = self->connectionInformation_;
    }
    completion(std::move(information));
  });
}

TimingData CurlURLTask::timingData() const {
  const MutexLock lock(mutex_);
  return timing_;
}

std::shared_ptr<const URLRequest> CurlURLTask::_request() const {
  const MutexLock lock(mutex_);
  return order_.request;
}

std::optional<CurlURLTask::Order> CurlURLTask::order() const {
  const MutexLock lock(mutex_);
  if (cancelRequested_) return std::nullopt;
  return order_;
}

void CurlURLTask::setRequest(std::shared_ptr<const URLRequest> request) {
  const MutexLock lock(mutex_);
  order_.request.swap(request);
}

}  // namespace zelkord
