#pragma once

#include "platform/linux/loop/CarriedWork.h"

namespace zelkord {

class PoolWorker;

// Around anything for which a thread may have to wait long (another process, the network, a disk, a
// lock held across such): if the thread is a pool worker, another worker takes its turn meanwhile;
// what a leader of a loop has not begun is passed on. Costs nothing on other threads, two short
// locks on workers; nests.
class BlockingScope {
 public:
  BlockingScope();
  // For a wait that may as well end at once, without what it is for: see `isRefused`.
  enum class Refusable { Yes };
  explicit BlockingScope(Refusable);
  ~BlockingScope();
  BlockingScope(const BlockingScope&) = delete;
  BlockingScope& operator=(const BlockingScope&) = delete;

  // Whether too many workers wait already. Nobody takes this one's turn then, so it must not wait.
  bool isRefused() const { return isRefused_; }

 private:
  const WorkCarrier::Pause pause_;
  bool isRefused_ = false;
  PoolWorker* const worker_;  // null when this scope changes nothing
};

}  // namespace zelkord
