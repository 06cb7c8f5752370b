#pragma once

#include <memory>

#include "base/Namespace.h"

namespace zelkord {

class QueueCore;

// Who has a queue's tasks run: the worker pool or the main loop. Each submission is one call of
// `runTicket` later. Threading: any thread.
class Executor {
 public:
  virtual ~Executor() = default;
  virtual void submit(std::shared_ptr<QueueCore> core) = 0;
};

}  // namespace zelkord
