#pragma once

#include "base/Mutex.h"
#include "platform/api/Counters.h"

namespace zelkord {

// Counters in memory.
// Threading: any thread.
class FakeCounters final : public Counters {
 public:
  void add(std::string_view key, std::int64_t amount) override {
    const MutexLock lock(mutex_);
    values_[std::string(key)] += amount;
  }
  void set(std::string_view key, std::int64_t value) override {
    const MutexLock lock(mutex_);
    values_[std::string(key)] = value;
  }
  std::map<std::string, std::int64_t> all() const override {
    const MutexLock lock(mutex_);
    return values_;
  }
  // Zero for a key that was never touched.
  std::int64_t value(const std::string& key) const {
    const MutexLock lock(mutex_);
    const auto found = values_.find(key);
    return found == values_.end() ? 0 : found->second;
  }

 private:
  mutable Mutex mutex_;
  std::map<std::string, std::int64_t> values_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
