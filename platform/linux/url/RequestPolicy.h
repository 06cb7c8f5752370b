#pragma once

#include <optional>
#include <string>
#include <variant>

#include "base/Error.h"
#include "platform/api/URLRequest.h"

namespace zelkord {

inline constexpr int kMaximumRedirects = 20;

// Why a request may not be sent at all: -1002 for a URL, method or header that cannot stand in a
// request, -1022 for unencrypted HTTP to a host other than this one. None: it may.
std::optional<Error> refusalOf(const URLRequest& request);

// Whether a response sends its request elsewhere.
bool isRedirect(const URLResponse& response);

// The request that follows a redirect (RFC 9110, 15.4), or why it is not followed. Credentials and
// headers that begin with "X-Quenta-" do not leave for another host and port.
std::variant<URLRequest, Error> redirected(const URLRequest& request, const URLResponse& response);

// How long it may go without progress: its own time-out within bounds, or the default one.
Duration timeoutOf(const URLRequest& request);

// Whether a request that reached nobody may be sent once more by itself.
bool mayBeRepeated(const URLRequest& request);

}  // namespace zelkord
