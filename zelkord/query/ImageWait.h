#pragma once

#include <cstddef>
#include <memory>

#include "base/Mutex.h"
#include "platform/api/WorkQueues.h"

namespace zelkord {

// What a call for images waits on: the images under way. Whoever knows that nobody wants the answer
// any more gives the wait up, so that it does not keep its thread.
//
// Threading: any thread.
class ImageWait final {
 public:
  explicit ImageWait(WorkQueues& queues) : group_(queues.makeGroup()) {}

  void enter();
  // Once for each `enter`.
  void leave();
  // Ends the wait, also one that begins later.
  void giveUp();
  // Until nothing is under way, for at most `limit` of real time.
  void wait(Duration limit) { group_->wait(limit); }

 private:
  const std::unique_ptr<Group> group_;

  Mutex mutex_;
  std::size_t underWay_ ZK_GUARDED_BY(mutex_) = 0;  // as the group has it
  bool givenUp_ ZK_GUARDED_BY(mutex_) = false;
};

}  // namespace zelkord
