#pragma once

#include <utility>

#include "base/Mutex.h"

namespace zelkor {

// A value that several threads read and replace whole, like an atomic property.
template <typename T>
class Guarded {
 public:
  Guarded() = default;
  explicit Guarded(T value) : value_(std::move(value)) {}

  T get() const {
    const MutexLock lock(mutex_);
    return value_;
  }
  void set(T value) {
    const MutexLock lock(mutex_);
    std::swap(value_, value);  // the old value is released after the lock
  }

 private:
  mutable Mutex mutex_;
  T value_ ZK_GUARDED_BY(mutex_) = {};
};

}  // namespace zelkor
