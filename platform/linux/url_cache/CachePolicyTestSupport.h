#pragma once

#include <algorithm>
#include <string>
#include <string_view>
#include <utility>

#include "platform/linux/url_cache/StoredResponse.h"

namespace zelkord {

// Sun, 22 Nov 2026 12:00:00 GMT.
inline constexpr WallTime kCacheTestTime{std::chrono::seconds(1'795'348'800)};

// A response that was asked for and came at that time.
inline StoredResponse storedForTest(HTTPHeaders headers, int status = 200,
                                    std::string body = "body") {
  return {.response = {.status = status, .headers = std::move(headers)},
          .body = Data(std::move(body)),
          .requestedAt = kCacheTestTime,
          .receivedAt = kCacheTestTime};
}

// "A: 1\nB: 2" as headers.
inline HTTPHeaders headersForTest(std::string_view lines) {
  HTTPHeaders headers;
  while (!lines.empty()) {
    const auto line = lines.substr(0, lines.find('\n'));
    lines.remove_prefix(std::min(line.size() + 1, lines.size()));
    const auto colon = line.find(": ");
    headers.emplace_back(line.substr(0, colon), line.substr(colon + 2));
  }
  return headers;
}

}  // namespace zelkord
