#include "platform/testing/FakeURLTask.h"

#include <utility>

#include "base/Check.h"

namespace zelkord {

bool FakeURLTask::isResumed() const {
  const MutexLock lock(mutex_);
  return wasResumed_;
}

bool FakeURLTask::isCancelled() const {
  const MutexLock lock(mutex_);
  return cancelled_;
}

bool FakeURLTask::isProxyEnabled() const {
  const MutexLock lock(mutex_);
  return proxyEnabled_;
}

bool FakeURLTask::isPending() const {
  const MutexLock lock(mutex_);
  return state_ == State::Resumed;
}

void FakeURLTask::succeed(int status, std::string body, HTTPHeaders headers) {
  finish({.data = Data(std::move(body)),
          .response = URLResponse{currentRequest().url, status, std::move(headers)}});
}

void FakeURLTask::fail(Error error) { finish({.error = std::move(error)}); }

void FakeURLTask::nonHTTP(std::string body) {
  finish({.data = Data(std::move(body)),
          .response = URLResponse{currentRequest().url, std::nullopt, {}}});
}

void FakeURLTask::finish(URLResult result) {
  {
    const MutexLock lock(mutex_);
    ZK_CHECK(wasResumed_ || cancelled_, "a task is answered after it was resumed");
    ZK_CHECK(state_ != State::Answered || cancelled_, "a task is answered once");
  }
  _finish(std::move(result));
}

void FakeURLTask::setTimingData(TimingData timing) {
  const MutexLock lock(mutex_);
  timing_ = std::move(timing);
}

void FakeURLTask::setCurrentRequest(URLRequest request) {
  const MutexLock lock(mutex_);
  currentRequest_ = std::move(request);
}

void FakeURLTask::setConnectionInformation(json::object information) {
  const MutexLock lock(mutex_);
  information_ = std::move(information);
}

void FakeURLTask::resume() {
  {
    const MutexLock lock(mutex_);
    if (state_ != State::Suspended) return;
    state_ = State::Resumed;
    wasResumed_ = true;
  }
  const auto session = session_.lock();
  if (session && session->onResume) session->onResume(*this);
}

void FakeURLTask::cancel() {
  {
    const MutexLock lock(mutex_);
    if (state_ == State::Answered) return;
    cancelled_ = true;
  }
  _finish({.error = urlError(URLErrorCode::Cancelled, "cancelled")});
}

URLRequest FakeURLTask::currentRequest() const {
  const MutexLock lock(mutex_);
  return currentRequest_;
}

TimingData FakeURLTask::timingData() const {
  const MutexLock lock(mutex_);
  return timing_;
}

bool FakeURLTask::enableProxy(Error* error) {
  const auto session = session_.lock();
  if (session && session->proxyError) {
    if (error) *error = *session->proxyError;
    return false;
  }
  const MutexLock lock(mutex_);
  proxyEnabled_ = true;
  return true;
}

void FakeURLTask::connectionInformation(
    std::function<void(std::optional<json::object>)> completion) {
  const auto session = session_.lock();
  if (!session) return;
  const MutexLock lock(mutex_);
  session->queue->async([completion = std::move(completion), information = information_] {
    completion(information);
  });
}

void FakeURLTask::_finish(URLResult result) {
  URLCompletion completion;
  {
    const MutexLock lock(mutex_);
    if (state_ == State::Answered) return;
    state_ = State::Answered;
    completion = std::exchange(completion_, nullptr);
  }
  const auto session = session_.lock();
  if (!session || !completion) return;
  auto* files = isDownload_ && result.data ? session->files : nullptr;
  session->queue->async([self = shared_from_this(), completion = std::move(completion),
                         result = std::move(result), files]() mutable {
    if (files) {
      files->put(kDownloadPath, std::string(result.data->view()));
      result.file = URLResult::File{kDownloadPath, result.data->size()};
      result.data.reset();
    }
    completion(self, result);
    if (files) files->remove(kDownloadPath);
  });
}

}  // namespace zelkord
