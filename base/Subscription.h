#pragma once

#include <functional>
#include <utility>

#include "base/Namespace.h"

namespace zelkor {

// A registration, a timer or a place: destroying or resetting it cancels. Move-only; empty after a
// move.
//
// A call-back that is running while its subscription is destroyed on another thread may still
// finish; call-backs that may outlive their object hold it weakly.
class [[nodiscard]] Subscription {
 public:
  Subscription() = default;
  explicit Subscription(std::function<void()> cancel) : cancel_(std::move(cancel)) {}
  Subscription(Subscription&& other) noexcept : cancel_(std::exchange(other.cancel_, nullptr)) {}
  Subscription& operator=(Subscription&& other) noexcept {
    if (this != &other) {
      reset();
      cancel_ = std::exchange(other.cancel_, nullptr);
    }
    return *this;
  }
  ~Subscription() { reset(); }

  explicit operator bool() const { return cancel_ != nullptr; }
  void reset() {
    if (const auto cancel = std::exchange(cancel_, nullptr)) cancel();
  }
  // Gives up the right to cancel: what was registered goes on by itself.
  void detach() { cancel_ = nullptr; }

 private:
  std::function<void()> cancel_;
};

}  // namespace zelkor
