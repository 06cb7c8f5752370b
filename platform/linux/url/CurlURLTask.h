#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "base/Mutex.h"
#include "platform/api/URLSession.h"
#include "platform/linux/url/DelegateQueue.h"
#include "platform/linux/url/ProxyConfiguration.h"

namespace zelkord {

class CurlTransfer;
class CurlURLSession;

// A task of a CurlURLSession.
//
// States: suspended, running (with the loop), finished (its result waits on the delegate
// queue), completed. A `cancel` that returns before the completion begins makes its result -999,
// whatever the loop has found meanwhile.
//
// Threading: any thread, except for the operations marked otherwise.
// Ownership: the loop holds a running task, the delegate queue a finished one. A task whose
// session is gone never completes.
class CurlURLTask final : public URLTask, public std::enable_shared_from_this<CurlURLTask> {
 public:
  struct Order {
    std::shared_ptr<const URLRequest> request;
    std::shared_ptr<const ProxyConfiguration> proxy;  // null: not enabled
    std::uint64_t maximumBody = 0;
    SteadyTime resumedAt{};
    std::string identity;       // of whose requests it is; empty: nobody's
    std::uint64_t endings = 0;  // how many identities of the session had ended when it was made
  };

  CurlURLTask(std::weak_ptr<CurlURLSession> session, std::shared_ptr<DelegateQueue> delegateQueue,
              Order order, URLCompletion completion);

  // URLTask
  void resume() override;
  void cancel() override;
  URLRequest currentRequest() const override { return *_request(); }
  TimingData timingData() const override;
  bool enableProxy(Error* error) override;
  void connectionInformation(std::function<void(std::optional<json::object>)> completion) override;

  // For the loop: what to do; none for a task that was cancelled.
  std::optional<Order> order() const;
  void setRequest(std::shared_ptr<const URLRequest> request);
  // The end; the first one counts.
  void finish(URLResult result, TimingData timing = {},
              std::optional<json::object> connectionInformation = {});
  // The loop's own: what carries the task.
  CurlTransfer* transfer = nullptr;

 private:
  enum class State { Suspended, Running, Finished, Completed };
  std::shared_ptr<const URLRequest> _request() const;
  void _complete();

  // Fixed after construction.
  const std::weak_ptr<CurlURLSession> session_;
  const std::shared_ptr<DelegateQueue> delegateQueue_;

  mutable Mutex mutex_;
  State state_ ZK_GUARDED_BY(mutex_) = State::Suspended;
  bool cancelRequested_ ZK_GUARDED_BY(mutex_) = false;
  Order order_ ZK_GUARDED_BY(mutex_);
  URLCompletion completion_ ZK_GUARDED_BY(mutex_);
  URLResult result_ ZK_GUARDED_BY(mutex_);
  TimingData timing_ ZK_GUARDED_BY(mutex_);
  std::optional<json::object> connectionInformation_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
