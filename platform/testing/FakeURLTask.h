#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "base/Mutex.h"
#include "platform/api/URLSession.h"
#include "platform/api/WorkQueue.h"
#include "platform/testing/FakeFileManager.h"

namespace zelkord {

// A task that the test answers.
//
// States: suspended, resumed, answered (its completion is on the way or has run). Only a resumed
// task can be answered, and only once: answers to one that was cancelled are dropped, as a late
// reply would be.
//
// Threading: any thread; the completion runs on the session's delegate queue.
class FakeURLTask final : public URLTask, public std::enable_shared_from_this<FakeURLTask> {
 public:
  // What goes for every task of a session. The delegate queue is gone once the session is.
  struct Session {
    std::shared_ptr<SerialQueue> queue;
    std::function<void(FakeURLTask&)> onResume;
    std::optional<Error> proxyError;
    FakeFileManager* files = nullptr;  // where downloads go
  };

  FakeURLTask(std::weak_ptr<Session> session, URLRequest request, URLCompletion completion)
      : request_(std::move(request)),
        session_(std::move(session)),
        currentRequest_(request_),
        completion_(std::move(completion)) {}

  // Makes it a download: its body is a file of the session's file manager until the completion
  // returns. Before `resume`.
  void setDownload() { isDownload_ = true; }
  bool isDownload() const { return isDownload_; }

  // What the code under test asked for.
  const URLRequest& request() const { return request_; }
  bool isResumed() const;
  bool isCancelled() const;
  bool isProxyEnabled() const;
  // Resumed and neither answered nor cancelled.
  bool isPending() const;

  // Answers.
  void succeed(int status = 200, std::string body = {}, HTTPHeaders headers = {});
  void fail(Error error);
  // An answer that is no HTTP response.
  void nonHTTP(std::string body = {});
  void finish(URLResult result);

  // What the task reports of itself; set before the answer.
  void setTimingData(TimingData timing);
  void setCurrentRequest(URLRequest request);
  void setConnectionInformation(json::object information);

  // URLTask
  void resume() override;
  void cancel() override;
  URLRequest currentRequest() const override;
  TimingData timingData() const override;
  bool enableProxy(Error* error) override;
  void connectionInformation(std::function<void(std::optional<json::object>)> completion) override;

 private:
  enum class State { Suspended, Resumed, Answered };
  static constexpr const char* kDownloadPath = "/downloads/body";
  void _finish(URLResult result);

  // Fixed after construction.
  const URLRequest request_;
  const std::weak_ptr<Session> session_;
  bool isDownload_ = false;

  mutable Mutex mutex_;
  State state_ ZK_GUARDED_BY(mutex_) = State::Suspended;
  bool wasResumed_ ZK_GUARDED_BY(mutex_) = false;
  bool cancelled_ ZK_GUARDED_BY(mutex_) = false;
  bool proxyEnabled_ ZK_GUARDED_BY(mutex_) = false;
  URLRequest currentRequest_ ZK_GUARDED_BY(mutex_);
  TimingData timing_ ZK_GUARDED_BY(mutex_);
  std::optional<json::object> information_ ZK_GUARDED_BY(mutex_);
  URLCompletion completion_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
