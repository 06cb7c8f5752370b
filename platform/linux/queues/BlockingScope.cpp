#include "platform/linux/queues/BlockingScope.h"

#include "platform/linux/queues/WorkerPool.h"

namespace zelkord {

BlockingScope::BlockingScope() : worker_(WorkerPool::beginBlocking()) {}

BlockingScope::~BlockingScope() {
  if (worker_) WorkerPool::endBlocking(*worker_);
}

}  // namespace zelkord
