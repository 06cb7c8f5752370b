#pragma once

#include <cstddef>
#include <cstdint>
#include <deque>
#include <vector>

#include "base/Mutex.h"
#include "zelkord/feedback/ZelkorFeedback.h"

namespace zelkord {

// The last records of a session, bounded: the oldest go first.
// Threading: any thread.
class RecentRecords final {
 public:
  explicit RecentRecords(std::size_t limit) : limit_(limit) {}

  void add(ZelkorFeedback feedback);
  void clear();
  std::vector<ZelkorFeedback> all() const;
  // How many were ever added.
  std::uint64_t total() const;

 private:
  const std::size_t limit_;
  mutable Mutex mutex_;
  std::deque<ZelkorFeedback> records_ ZK_GUARDED_BY(mutex_);
  std::uint64_t total_ ZK_GUARDED_BY(mutex_) = 0;
};

}  // namespace zelkord
