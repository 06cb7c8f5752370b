#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

#include "platform/api/URLRequest.h"
#include "platform/linux/url_cache/Digest.h"

namespace zelkord {

inline constexpr std::size_t kMaximumVaryNames = 1024;  // bytes

// The request headers that a response varies with (RFC 9111, 4.1): in lower case, sorted, joined by
// commas; empty when there are none. None when no other request may have the response: "*", or a
// list that cannot be read or is longer than kMaximumVaryNames.
std::optional<std::string> varyNames(const URLResponse& response);

// What a request says under these names. Requests with the same URL and variant may have the same
// response; a header that is missing is not the same as an empty one.
Digest variantOf(std::string_view names, const URLRequest& request);

}  // namespace zelkord
