#pragma once

#include <cstddef>
#include <cstdint>
#include <deque>
#include <vector>

#include "base/Mutex.h"
#include "zelkord/feedback/ZelkorFeedback.h"

namespace zelkord {

// The last records of a session, bounded by their number and, since their texts come from clients
// and services, by about 4 MiB: the oldest go first. The newest is always kept.
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
  static constexpr std::size_t kMaximumBytes = 4 * 1024 * 1024;

  struct Record {
    ZelkorFeedback feedback;
    std::size_t bytes = 0;  // of its texts
  };

  const std::size_t limit_;
  mutable Mutex mutex_;
  std::deque<Record> records_ ZK_GUARDED_BY(mutex_);
  std::size_t bytes_ ZK_GUARDED_BY(mutex_) = 0;
  std::uint64_t total_ ZK_GUARDED_BY(mutex_) = 0;
};

}  // namespace zelkord
