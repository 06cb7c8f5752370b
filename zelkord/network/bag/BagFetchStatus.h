#pragma once

#include <optional>
#include <string>

#include "base/Time.h"

namespace zelkord {

// How fetching the bag goes, for people.
struct BagFetchStatus {
  struct Failure {
    WallTime time;
    std::string reason;  // bagFailureReason
  };

  std::string url;  // where the bag comes from; no query, no user information
  std::optional<Failure> lastFailure;
  // From then on the next read of the bag begins a fetch; none: no read ever does.
  std::optional<WallTime> nextAttempt;
};

}  // namespace zelkord
