#pragma once

#include "corezelkor/Messages.h"
#include "platform/api/URLRequest.h"

namespace zelkord {

// The request as it was built and the final response, for a client that asked for them.
void addHTTPExchange(ZLKReply& reply, const URLRequest& request, const URLResponse& response);

}  // namespace zelkord
