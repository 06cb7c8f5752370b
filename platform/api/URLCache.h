#pragma once

#include <optional>

#include "base/Data.h"
#include "platform/api/URLRequest.h"

namespace zelkord {

struct CachedResponse {
  URLResponse response;
  Data data;  // the decoded body
};

// What is kept by hand of a session's responses: neither freshness nor no-store counts, nor whose
// request asks. Ordinary tasks keep theirs by themselves, under the rules of HTTP, and apart: they
// find nothing that is kept here, nor is what they keep found here.
//
// Threading: any thread; calls may block for the file system.
// Errors: none. What cannot be kept is not kept, and what was damaged is not found.
class URLCache {
 public:
  virtual ~URLCache() = default;
  // None when nothing is kept for the request's URL, or only under other values of the headers that
  // the response varies with.
  virtual std::optional<CachedResponse> lookup(const URLRequest& request) = 0;
  // Replaces what is kept for the request's URL and those values.
  virtual void store(const URLRequest& request, CachedResponse response) = 0;
};

}  // namespace zelkord
