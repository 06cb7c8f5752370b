#include "platform/api/WorkQueue.h"

#include "base/Check.h"

namespace zelkord {

void WorkQueue::assertCurrent() const {
  ZK_CHECK(isCurrent(), "not on the queue that owns this state");
}

void ConcurrentQueue::assertReading() const {
  ZK_CHECK(isCurrent(), "not on the queue that owns this state");
}

void ConcurrentQueue::assertBarrier() const {
  ZK_CHECK(isBarrierCurrent(), "not in a barrier task of the queue that owns this state");
}

}  // namespace zelkord
