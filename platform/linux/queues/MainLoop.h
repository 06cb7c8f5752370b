#pragma once

#include <deque>
#include <memory>

#include "base/CondVar.h"
#include "base/Mutex.h"
#include "platform/linux/queues/Executor.h"

namespace zelkord {

// Runs the main queue's tasks on the thread that calls `run`.
// Threading: any thread; one at a time runs.
class MainLoop final : public Executor {
 public:
  void submit(std::shared_ptr<QueueCore> core) override;
  // Returns after `stop`, which may come first.
  void run();
  void stop();

 private:
  std::shared_ptr<QueueCore> _next();

  Mutex mutex_;
  CondVar changed_;
  std::deque<std::shared_ptr<QueueCore>> tickets_ ZK_GUARDED_BY(mutex_);
  bool stopped_ ZK_GUARDED_BY(mutex_) = false;
};

}  // namespace zelkord
