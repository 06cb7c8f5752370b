#pragma once

#include "platform/linux/url_cache/StoredResponse.h"

namespace zelkord {

// Whether a server can be asked if a response is still right.
bool hasValidator(const URLResponse& response);

// The request that asks so: with If-None-Match and If-Modified-Since as far as the response has an
// ETag and a date of change. Requires a request without conditions.
URLRequest conditionalRequest(const URLRequest& request, const StoredResponse& stored);
// The same without the conditions.
URLRequest unconditionalRequest(URLRequest request);

// Whether a 304 speaks of this response: it names no other ETag.
bool confirms(const URLResponse& notModified, const StoredResponse& stored);

// The response with the headers that a 304 brought (RFC 9111, 3.2) and the times of that answer.
StoredResponse freshened(const StoredResponse& stored, const URLResponse& notModified,
                         WallTime requestedAt, WallTime receivedAt);

// The headers without those of the connection that brought them (RFC 9111, 3.1).
HTTPHeaders endToEndHeaders(const HTTPHeaders& headers);

}  // namespace zelkord
