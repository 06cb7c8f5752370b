#pragma once

#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "base/Mutex.h"
#include "platform/api/Clock.h"
#include "platform/api/ProcessTransactions.h"

namespace zelkord {

// The process's transactions, counted in memory.
//
// Threading: any thread.
// Ownership: the clock outlives this; transactions may outlive it.
class CountedTransactions final : public ProcessTransactions {
 public:
  explicit CountedTransactions(const Clock& clock);

  Transaction open(std::string name) override;
  std::vector<std::string> openNames() const override;

  // Since when none is open; none while one is.
  std::optional<SteadyTime> idleSince() const;
  // Calls `task` once, on the thread that closes the last open transaction; at once when none is
  // open. A later call replaces the task.
  void whenIdle(std::function<void()> task);

 private:
  struct State;
  const std::shared_ptr<State> state_;
};

}  // namespace zelkord
