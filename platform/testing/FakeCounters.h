#pragma once

#include "base/Mutex.h"
#include "platform/api/BoundedCounters.h"
#include "platform/api/Counters.h"

namespace zelkord {

// Counters in memory, with the bounds of the real ones.
// Threading: any thread.
class FakeCounters final : public Counters {
 public:
  void add(std::string_view key, std::int64_t amount) override {
    const MutexLock lock(mutex_);
    values_.add(key, amount);
  }
  void set(std::string_view key, std::int64_t value) override {
    const MutexLock lock(mutex_);
    values_.set(key, value);
  }
  std::map<std::string, std::int64_t> all() const override {
    const MutexLock lock(mutex_);
    return {values_.values().begin(), values_.values().end()};
  }
  // Zero for a key that was never touched.
  std::int64_t value(const std::string& key) const {
    const MutexLock lock(mutex_);
    const auto found = values_.values().find(key);
    return found == values_.values().end() ? 0 : found->second;
  }

 private:
  mutable Mutex mutex_;
  BoundedCounters values_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
