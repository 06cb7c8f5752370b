#include "platform/linux/queues/BlockingScope.h"

#include "platform/linux/queues/WorkerPool.h"

namespace zelkord {

BlockingScope::BlockingScope() : worker_(WorkerPool::beginBlocking(nullptr)) {}

BlockingScope::BlockingScope(Refusable) : worker_(WorkerPool::beginBlocking(&isRefused_)) {}

BlockingScope::~BlockingScope() {
  if (worker_) WorkerPool::endBlocking(*worker_);
}

}  // namespace zelkord
