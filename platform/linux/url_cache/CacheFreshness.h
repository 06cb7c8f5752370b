#pragma once

#include <chrono>

#include "platform/linux/url_cache/CacheDirectives.h"
#include "platform/linux/url_cache/StoredResponse.h"

namespace zelkord {

// The age of a response that came after now: the wall clock has been set back, nobody knows.
inline constexpr std::chrono::seconds kUnknownAge = std::chrono::seconds::max();

// How long a response stays fresh, by its own word or by how old its content was (RFC 9111, 4.2.1
// and 4.2.2). Never negative; zero when it says so or what it says cannot be read.
std::chrono::seconds freshnessLifetime(const StoredResponse& stored);

// RFC 9111, 4.2.3. Never negative.
std::chrono::seconds currentAge(const StoredResponse& stored, WallTime now);

// Whether the response may answer a request with these directives without being validated.
bool isFresh(const StoredResponse& stored, WallTime now, const CacheDirectives& request);

// Whether caches may judge a response of that status by themselves (RFC 9110, 15.1).
bool isHeuristicallyCacheable(int status);

}  // namespace zelkord
