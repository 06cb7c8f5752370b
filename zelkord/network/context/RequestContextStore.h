#pragma once

#include <atomic>
#include <cstdint>
#include <functional>
#include <memory>

#include "base/FunctionRef.h"
#include "platform/api/WorkQueues.h"
#include "zelkord/network/context/RequestContext.h"

namespace zelkord {

// Which requests a change of the context can alter.
enum class ContextReach { Queries, BagURL };

// Keeps the context: readers side by side, each change alone, so that a reader sees all of a change
// or nothing of it.
//
// Threading: any thread but a task of the store's own queue. Changes happen in the order in which
// they are given; a read sees every change given before it.
class RequestContextStore final : public std::enable_shared_from_this<RequestContextStore> {
 public:
  explicit RequestContextStore(WorkQueues& queues);

  // Runs `body` at once, on this thread.
  void read(FunctionRef<void(const RequestContext&)> body) const;
  // Runs `change` soon. It captures nothing that it could outlive.
  void update(std::function<void(RequestContext&)> change,
              ContextReach reach = ContextReach::Queries);
  // Runs `change` at once, on this thread.
  void updateNow(FunctionRef<void(RequestContext&)> change);

  // Grows with every change that reaches the bag's URL: before `update` returns, and before a
  // reader sees it.
  std::uint64_t generation() const { return generation_.load(std::memory_order_acquire); }

 private:
  void _change(const std::function<void(RequestContext&)>& change, ContextReach reach);

  // Own synchronisation.
  std::atomic<std::uint64_t> generation_ = 0;

  // Fixed after construction.
  const std::unique_ptr<ConcurrentQueue> queue_;

  // Queue state.
  RequestContext context_ ZK_ON(queue_);
};

}  // namespace zelkord
