#pragma once

#include <cstdint>
#include <memory>

#include "base/CondVar.h"
#include "base/Mutex.h"
#include "platform/api/WorkQueues.h"

namespace zelkord {

// A count that threads wait on, shared with the signals under way so that a woken thread may free
// its owner at once.
//
// Time-outs are real time without suspend: a device that sleeps meanwhile wakes with the rest of
// the time-out ahead. A worker that is one too many to wait does not: its time-out passes at once.
struct WaitState {
  Mutex mutex;
  CondVar changed;
  std::uint64_t count ZK_GUARDED_BY(mutex) = 0;
};

class LinuxSemaphore final : public Semaphore {
 public:
  explicit LinuxSemaphore(unsigned permits);
  void signal(unsigned permits) override;
  bool wait(Duration timeout) override;

 private:
  const std::shared_ptr<WaitState> state_ = std::make_shared<WaitState>();
};

class LinuxGroup final : public Group {
 public:
  void enter() override;
  void leave() override;
  bool wait(Duration timeout) override;

 private:
  const std::shared_ptr<WaitState> state_ = std::make_shared<WaitState>();
};

}  // namespace zelkord
