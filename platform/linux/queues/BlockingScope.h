#pragma once

#include "base/Namespace.h"

namespace zelkord {

class PoolWorker;

// Around anything for which a thread may have to wait long (another process, the network, a lock
// held across such): if the thread is a pool worker, another worker takes its turn meanwhile. Costs
// nothing on other threads; nests.
class BlockingScope {
 public:
  BlockingScope();
  ~BlockingScope();
  BlockingScope(const BlockingScope&) = delete;
  BlockingScope& operator=(const BlockingScope&) = delete;

 private:
  PoolWorker* const worker_;  // null when this scope changes nothing
};

}  // namespace zelkord
