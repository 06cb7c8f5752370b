#include "zelkord/network/context/RequestContextStore.h"

#include <utility>

namespace zelkord {

RequestContextStore::RequestContextStore(WorkQueues& queues)
    : queue_(queues.makeConcurrentQueue("com.quenta.zelkord.contextaccess")) {}

void RequestContextStore::read(FunctionRef<void(const RequestContext&)> body) const {
  queue_->sync([&] {
    queue_->assertReading();
    body(context_);
  });
}

void RequestContextStore::update(std::function<void(RequestContext&)> change, ContextReach reach) {
  queue_->barrierAsync([self = shared_from_this(), change = std::move(change), reach] {
    self->_change(change, reach);
  });
  // Again, for whoever reads it before the change is made but builds a request after it.
  if (reach == ContextReach::BagURL) generation_.fetch_add(1, std::memory_order_acq_rel);
}

void RequestContextStore::updateNow(FunctionRef<void(RequestContext&)> change) {
  queue_->barrierSync([&] {
    queue_->assertBarrier();
    change(context_);
  });
}

void RequestContextStore::_change(const std::function<void(RequestContext&)>& change,
                                  ContextReach reach) {
  queue_->assertBarrier();
  if (reach == ContextReach::BagURL) generation_.fetch_add(1, std::memory_order_acq_rel);
  change(context_);
}

}  // namespace zelkord
