#pragma once

#include "platform/api/URLSession.h"
#include "platform/linux/url_cache/LinuxURLCache.h"

namespace zelkord {

// Keeps what a completed task was answered with, if the rules of HTTP allow it; a response after
// redirects belongs to the URL that gave it. False when it is not kept.
bool keepIfAllowed(LinuxURLCache& cache, CacheScopes::Scope scope, const URLTask& task,
                   const URLResult& result, WallTime requestedAt);

// What a task is answered with from the cache: the response with its age (RFC 9111, 5.1).
URLResult answerFromCache(const URLRequest& request, const StoredResponse& stored, WallTime now);

}  // namespace zelkord
