#pragma once

#include <string>
#include <vector>

#include "base/Namespace.h"
#include "base/Subscription.h"

namespace zelkord {

// Work that must not be cut short by an idle exit. One that is open keeps the daemon; closing is
// destroying.
using Transaction = Subscription;

// Threading: any thread.
class ProcessTransactions {
 public:
  virtual ~ProcessTransactions() = default;
  virtual Transaction open(std::string name) = 0;
  // One entry for each that is open, sorted.
  virtual std::vector<std::string> openNames() const = 0;
};

}  // namespace zelkord
