#pragma once

#include "platform/api/URLRequest.h"
#include "platform/linux/url_cache/CacheDirectives.h"
#include "platform/linux/url_cache/StoredResponse.h"

namespace zelkord {

// What an ordinary task does with the cache.
enum class CacheUse {
  None,       // neither looks nor stores
  StoreOnly,  // goes to the network as it is; a response that may be kept is
  LookUpAndStore,
};
// None for other methods than GET, and for requests with Authorization, Range or "no-store".
// Requests that ignore the cache or carry conditions of their own go to the network as they are.
CacheUse cacheUseOf(const URLRequest& request);

// The request's own wishes: its Cache-Control, or "Pragma: no-cache" without one.
CacheDirectives requestDirectives(const URLRequest& request);

// Whether the cache keeps what such a request was answered with: a whole response that is not
// forbidden to be stored, does not vary with everything, and can be of use again, because it stays
// fresh for a while or can be validated.
bool mayBeStored(const URLResult& result, const StoredResponse& candidate);
// A cheap test that most responses fail which may not be stored.
bool saysHowToStore(const URLResponse& response);

// Whether a response may answer tasks at all.
bool mayAnswerTasks(const StoredResponse& stored);

// Whether a request with that outcome has changed what its URL stands for (RFC 9111, 4.4).
bool isUnsafeMethod(const URLRequest& request);
bool changesResource(const URLResult& result);

}  // namespace zelkord
