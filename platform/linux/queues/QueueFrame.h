#pragma once

#include <memory>

#include "platform/linux/queues/QueueCore.h"

namespace zelkord {

// A thread's presence in a queue while a task runs. The frames of a thread form a chain, innermost
// first.
//
// Ownership: on the stack of the thread. A queue that is destroyed from within hands its core to
// the frame.
class QueueFrame {
 public:
  using Access = QueueCore::Access;

  QueueFrame(const QueueCore& core, Access access) : core_(core), access_(access), outer_(top_) {
    top_ = this;
  }
  ~QueueFrame() { top_ = outer_; }
  QueueFrame(const QueueFrame&) = delete;
  QueueFrame& operator=(const QueueFrame&) = delete;

  // The innermost frame of that queue with at least that access, or null.
  static QueueFrame* find(const QueueCore& core, Access least) {
    for (QueueFrame* frame = top_; frame; frame = frame->outer_) {
      if (&frame->core_ == &core &&
          (least == Access::Shared || frame->access_ == Access::Exclusive)) {
        return frame;
      }
    }
    return nullptr;
  }

  void keepAlive(std::shared_ptr<const QueueCore> core) { kept_ = std::move(core); }
  std::shared_ptr<const QueueCore> takeKept() { return std::move(kept_); }

 private:
  static inline constinit thread_local QueueFrame* top_ = nullptr;

  const QueueCore& core_;
  const Access access_;
  QueueFrame* const outer_;
  std::shared_ptr<const QueueCore> kept_;
};

}  // namespace zelkord
