#pragma once

#include <chrono>
#include <condition_variable>
#include <functional>
#include <memory>
#include <optional>
#include <utility>
#include <vector>

#include "base/Mutex.h"
#include "base/Time.h"

namespace zelkor {

template <typename T>
class ZLKPromise;

// A value that is there, or will be. Made fulfilled, or by a ZLKPromise.
//
// Threading: any thread. Ownership: copies share the value, which lives as long as any of them.
// Errors: none of its own; where the work can fail, T says so. A promise that is given up leaves
// its future waiting for ever: whoever makes one answers for fulfilling it.
template <typename T>
class ZLKFuture {
 public:
  using Reaction = std::function<void(const T&)>;

  explicit ZLKFuture(T value) : state_(std::make_shared<State>()) {
    state_->fulfill(std::move(value));
  }

  bool isFulfilled() const { return state_->find() != nullptr; }

  // Blocks until the value is there. The reference is valid as long as any copy of the future.
  const T& get() const { return state_->await(); }
  // Null when it is still missing after `limit` of real time.
  const T* getWithin(Duration limit) const { return state_->awaitWithin(limit); }
  // The value when it is there already, else null.
  const T* find() const { return state_->find(); }

  // Calls back once: now and here when the value is there, else on the thread that fulfils, in the
  // order of registration.
  void then(Reaction reaction) const { state_->then(std::move(reaction)); }

 private:
  friend class ZLKPromise<T>;

  class State {
   public:
    bool fulfill(T value) {
      std::vector<Reaction> reactions;
      {
        const MutexLock lock(mutex_);
        if (value_) return false;
        value_ = std::move(value);
        reactions.swap(reactions_);
      }
      changed_.notify_all();
      for (const auto& reaction : reactions) reaction(*find());
      return true;
    }

    const T* find() const {
      const MutexLock lock(mutex_);
      return value_ ? &*value_ : nullptr;
    }

    const T& await() const {
      const MutexLock lock(mutex_);
      while (!value_) changed_.wait(mutex_);
      return *value_;
    }

    const T* awaitWithin(Duration limit) const {
      constexpr Duration kLongest = 24h * 365;  // far from the clock's end
      const auto end = std::chrono::steady_clock::now() + (limit < kLongest ? limit : kLongest);
      const MutexLock lock(mutex_);
      while (!value_) {
        if (changed_.wait_until(mutex_, end) == std::cv_status::timeout) break;
      }
      return value_ ? &*value_ : nullptr;
    }

    void then(Reaction reaction) {
      {
        const MutexLock lock(mutex_);
        if (!value_) {
          reactions_.push_back(std::move(reaction));
          return;
        }
      }
      reaction(*find());
    }

   private:
    mutable Mutex mutex_;
    mutable std::condition_variable_any changed_;
    std::optional<T> value_ ZK_GUARDED_BY(mutex_);  // written once
    std::vector<Reaction> reactions_ ZK_GUARDED_BY(mutex_);
  };

  explicit ZLKFuture(std::shared_ptr<State> state) : state_(std::move(state)) {}

  std::shared_ptr<State> state_;
};

}  // namespace zelkor
