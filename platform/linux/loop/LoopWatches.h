#pragma once

#include <sys/epoll.h>

#include <array>
#include <cstdint>
#include <functional>
#include <memory>
#include <unordered_map>

#include "base/FunctionRef.h"
#include "platform/linux/system/Descriptor.h"

namespace zelkord {

// The descriptors that a loop waits for.
//
// Threading: the loop; `wait` and `dispatch` on its leader, `wait` also while somebody else has
// the loop.
class LoopWatches final {
 public:
  using Ready = std::function<void(std::uint32_t events)>;
  enum class Wait { No, Yes };

  LoopWatches();

  // Can be read while there are events that have not been waited for.
  int descriptor() const { return epoll_.get(); }
  // Each edge of the descriptor ends a wait, and that is all.
  void addWaker(int descriptor);
  // The number by which it is removed: the descriptor's may soon be another one's.
  std::uint32_t add(int descriptor, std::uint32_t events, Ready ready);
  void remove(int descriptor, std::uint32_t serial);
  // Replaces the events of a watched descriptor.
  void change(int descriptor, std::uint32_t events);
  void clear();

  // Until there are events, unless some are left; or only looks for them.
  void wait(Wait wait);
  // Tells whoever watches; `before` each of them.
  void dispatch(FunctionRef<void()> before);

 private:
  static constexpr int kEventsAtOnce = 64;
  struct Watched {
    std::uint32_t serial;
    Ready ready;
  };

  void _set(int operation, int otherwise, int descriptor, std::uint32_t serial,
            std::uint32_t events);

  const Descriptor epoll_;

  // The leader's.
  std::array<epoll_event, kEventsAtOnce> events_;
  int count_ = 0;

  // The loop's.
  std::uint32_t lastSerial_ = 0;  // 0 is a waker's
  std::unordered_map<int, std::shared_ptr<const Watched>> watched_;
};

}  // namespace zelkord
