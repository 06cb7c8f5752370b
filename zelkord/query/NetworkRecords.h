#pragma once

#include <memory>
#include <optional>

#include "base/Error.h"
#include "base/Json.h"
#include "corezelkor/Messages.h"
#include "halvane/Feedback.h"
#include "platform/api/URLSession.h"

namespace zelkord {

class ClientState;

// The ends of a client's network requests, as feedback.

// A request that got no usable answer: an error record when there is an error (which also counts
// "noconnection"), then the end record.
void failSearchFeedback(const ClientState& state, const std::optional<Error>& error,
                        const ZLKRequest& request, const URLResult& result,
                        const TimingData& timing);

// The end record of a request that was answered. `rawResponse` is the parsed body, null when it did
// not parse: of a non-empty list, the service's own fields are kept; of several entries the last
// with each field wins. For a routed request the record waits for what the proxy knows of the
// connection.
void endNetworkFeedback(const std::shared_ptr<ClientState>& state, const ZLKRequest& request,
                        const json::value* rawResponse, const URLResult& result,
                        const std::shared_ptr<URLTask>& task);

}  // namespace zelkord
