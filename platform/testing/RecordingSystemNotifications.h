#pragma once

#include <string>
#include <vector>

#include "base/Mutex.h"
#include "platform/api/SystemNotifications.h"

namespace zelkord {

// Keeps the names that were posted, in order.
// Threading: any thread.
class RecordingSystemNotifications final : public SystemNotifications {
 public:
  void post(std::string_view name) override {
    const MutexLock lock(mutex_);
    names_.emplace_back(name);
  }
  std::vector<std::string> names() const {
    const MutexLock lock(mutex_);
    return names_;
  }

 private:
  mutable Mutex mutex_;
  std::vector<std::string> names_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
