#pragma once

#include <functional>
#include <vector>

#include "base/Mutex.h"
#include "platform/api/Signals.h"

namespace zelkord {

class LinuxWorkQueues;

// The end of the process, and its main thread.
//
// Threading: any thread; `runMainLoop` on the main one. Ownership: the queues outlive it.
class LinuxProcess final : public ProcessControl {
 public:
  explicit LinuxProcess(LinuxWorkQueues& queues);

  // Has `hook` run before the process ends, in the order of these calls, on the thread that calls
  // `exit`: saving counters first, flushing the log last. Hooks must not wait for queues.
  void atExit(std::function<void()> hook);

  // Does not return. The first call counts; a thread that calls it meanwhile stays there until the
  // end. A hook that calls it again ends the process at once.
  [[noreturn]] void exit(int status) override;
  void runMainLoop() override;
  void releaseFreeMemory() override;

 private:
  LinuxWorkQueues& queues_;

  Mutex mutex_;
  std::vector<std::function<void()>> hooks_ ZK_GUARDED_BY(mutex_);
  bool exiting_ ZK_GUARDED_BY(mutex_) = false;
};

}  // namespace zelkord
