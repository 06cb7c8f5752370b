#include "platform/linux/url_cache/ResponseKeeping.h"

#include <strings.h>

#include <algorithm>
#include <string>
#include <utility>

#include "platform/linux/url_cache/CacheDirectives.h"
#include "platform/linux/url_cache/CacheFreshness.h"
#include "platform/linux/url_cache/CacheRules.h"
#include "platform/linux/url_cache/CacheValidation.h"

namespace zelkord {

bool keepIfAllowed(LinuxURLCache& cache, CacheScopes::Scope scope, const URLTask& task,
                   const URLResult& result, WallTime requestedAt) {
  if (result.error || !result.data || !result.response) return false;
  if (!saysHowToStore(*result.response)) return false;
  StoredResponse candidate{.response = {.status = result.response->status,
                                        .headers = endToEndHeaders(result.response->headers)},
                           .body = *result.data,
                           .requestedAt = requestedAt,
                           .receivedAt = cache.now()};
  if (!mayBeStored(result, candidate)) return false;
  cache.keep(scope, unconditionalRequest(task.currentRequest()), std::move(candidate));
  return true;
}

URLResult answerFromCache(const URLRequest& request, const StoredResponse& stored, WallTime now) {
  URLResponse response = stored.response;
  response.url = request.url;
  const auto age = std::min(currentAge(stored, now), CacheDirectives::kMaximum);
  std::erase_if(response.headers,
                [](const auto& header) { return strcasecmp(header.first.c_str(), "Age") == 0; });
  response.headers.emplace_back("Age", std::to_string(age.count()));
  return {.data = stored.body, .response = std::move(response)};
}

}  // namespace zelkord
