#pragma once

#include <mutex>

#include "base/ThreadSafety.h"

namespace zelkor {

// std::mutex that clang's thread-safety analysis understands. For the inside of small, leaf-level
// types; components use queues.
class ZK_CAPABILITY("mutex") Mutex {
 public:
  void lock() ZK_ACQUIRE() { mutex_.lock(); }
  void unlock() ZK_RELEASE() { mutex_.unlock(); }

 private:
  friend class CondVar;
  std::mutex mutex_;
};

class ZK_SCOPED MutexLock {
 public:
  explicit MutexLock(Mutex& mutex) ZK_ACQUIRE(mutex) : mutex_(mutex) { mutex_.lock(); }
  ~MutexLock() ZK_RELEASE() { mutex_.unlock(); }
  MutexLock(const MutexLock&) = delete;
  MutexLock& operator=(const MutexLock&) = delete;

 private:
  Mutex& mutex_;
};

}  // namespace zelkor
