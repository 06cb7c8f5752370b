#pragma once

#include <atomic>
#include <functional>
#include <memory>

#include "platform/api/WorkQueues.h"

namespace zelkord {

// Ends a connection that has been silent for 180 to 240 seconds. A call that still waits for its
// answer keeps the connection from being silent.
//
// Threading: any thread; `timedOut` runs on the background queue, at most once a silence.
class IdleTimer final : public std::enable_shared_from_this<IdleTimer> {
 public:
  // Marks a call under way for as long as a copy lives.
  using CallMark = std::shared_ptr<void>;

  static std::shared_ptr<IdleTimer> make(WorkQueues& queues, std::function<void()> timedOut);

  // A message came: the silence begins anew.
  void rearm();
  CallMark callBegan();
  void cancel();

 private:
  explicit IdleTimer(std::function<void()> timedOut);
  void _fired();

  const std::function<void()> timedOut_;
  std::atomic<int> callsUnderWay_ = 0;
  std::atomic<bool> cancelled_ = false;
  std::unique_ptr<Timer> timer_;
};

}  // namespace zelkord
