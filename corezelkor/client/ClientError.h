#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "base/Error.h"
#include "base/Export.h"

namespace zelkor {

// What went wrong between a program and the daemon. Errors of other domains come from the daemon.
inline constexpr std::string_view kClientErrorDomain = "ZLKClientErrorDomain";

enum class ClientErrorCode : std::int64_t {
  NotReachable = 1,  // no daemon runs and none could be started
  Disconnected = 2,  // the connection ended before the answer; calling again makes a new one
  TimedOut = 3,      // no answer in time
  Refused = 4,       // the daemon, or the library for it, does not take these arguments
  BadReply = 5,      // the answer is not what the interface says
  Cancelled = 6,     // the client object is gone
};

ZK_EXPORT Error clientError(ClientErrorCode code, std::string reason);
ZK_EXPORT bool isClientError(const Error& error, ClientErrorCode code);

}  // namespace zelkor
