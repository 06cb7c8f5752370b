#pragma once

#include "base/Json.h"
#include "platform/api/URLRequest.h"

namespace zelkord {

// As feedback carries it: "domain_lookup", "connect", "tls", "request_start", "response_start",
// "response_end" (milliseconds from the task's start; null when the step did not happen),
// "protocol", "bytes_sent", "bytes_received", "retries", "reused".
json::object networkTimingData(const TimingData& timing);

}  // namespace zelkord
