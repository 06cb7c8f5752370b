#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "platform/linux/url_cache/StoredResponse.h"

namespace zelkord {

// Everything of a stored response but its body, as bytes:
//
//   status (0: none), time of the request, time of the response (nanoseconds since 1970),
//   number of headers; then each header's name and value, each after its length
//
// Numbers are unsigned, 8 bytes, least significant first.
std::string encodeStoredHead(const StoredResponse& stored);
// With an empty body. None for bytes that are not exactly one head.
std::optional<StoredResponse> decodeStoredHead(std::string_view bytes);

}  // namespace zelkord
