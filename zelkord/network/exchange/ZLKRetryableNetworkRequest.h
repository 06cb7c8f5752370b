#pragma once

#include <cstdint>
#include <memory>
#include <optional>

#include "platform/api/Clock.h"
#include "platform/api/URLSession.h"
#include "platform/api/WorkQueues.h"

namespace zelkord {

struct ZLKRetryableNetworkRequest {
  URLRequest httpRequest;  // the same for every attempt
  // No attempt begins after it; none: there is only the first one.
  std::optional<SteadyTime> expire;
  bool delayOnFail = false;  // 1.5 s before each further attempt, else at once
};

// The clock and the queues by which attempts are repeated.
struct RetryTiming {
  const Clock& clock;
  WorkQueues& queues;
};

// A suspended task for the request. An attempt that fails in transport is followed by another while
// `retriesLeft` and the deadline allow; any HTTP status is an answer. The completion runs once, on
// the session's delegate queue, with the task and result of the last attempt. Cancelling the task
// does not stop a retry that is scheduled already.
//
// `attempt` is 1 for callers. The session, the clock and the queues outlive the attempts.
std::shared_ptr<URLTask> dataTaskWithRetryableRequest(
    URLSession& session, std::shared_ptr<const ZLKRetryableNetworkRequest> request,
    unsigned attempt, unsigned retriesLeft, URLCompletion completion, RetryTiming timing);

// How long a tick of the monotonic clock is: numerator / denominator nanoseconds.
struct MonotonicTimebase {
  std::uint32_t numerator = 1;
  std::uint32_t denominator = 1;
};

// Milliseconds, truncated; a zero denominator gives 0.
std::uint64_t mach_duration_to_milliseconds(std::uint64_t ticks, MonotonicTimebase timebase = {});

}  // namespace zelkord
