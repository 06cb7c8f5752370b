#include "zelkord/feedback/RecentRecords.h"

#include <utility>

namespace zelkord {

void RecentRecords::add(ZelkorFeedback feedback) {
  const MutexLock lock(mutex_);
  ++total_;
  records_.push_back(std::move(feedback));
  if (records_.size() > limit_) records_.pop_front();
}

void RecentRecords::clear() {
  std::deque<ZelkorFeedback> released;
  const MutexLock lock(mutex_);
  released.swap(records_);
}

std::vector<ZelkorFeedback> RecentRecords::all() const {
  const MutexLock lock(mutex_);
  return {records_.begin(), records_.end()};
}

std::uint64_t RecentRecords::total() const {
  const MutexLock lock(mutex_);
  return total_;
}

}  // namespace zelkord
