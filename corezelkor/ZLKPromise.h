#pragma once

#include <memory>
#include <utility>

#include "corezelkor/ZLKFuture.h"

namespace zelkor {

// The side of a ZLKFuture that gives the value, once.
//
// Threading: any thread. Ownership: copies are the same promise.
template <typename T>
class ZLKPromise {
 public:
  ZLKPromise() : state_(std::make_shared<typename ZLKFuture<T>::State>()) {}

  ZLKFuture<T> future() const { return ZLKFuture<T>(state_); }

  // Wakes whoever waits and runs the reactions, on this thread. False, and without effect, when
  // there is a value already.
  bool fulfill(T value) const { return state_->fulfill(std::move(value)); }

 private:
  std::shared_ptr<typename ZLKFuture<T>::State> state_;
};

}  // namespace zelkor
