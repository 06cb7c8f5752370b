#pragma once

#include <cstdint>
#include <memory>

#include "base/Data.h"
#include "base/Time.h"
#include "platform/api/URLRequest.h"

namespace zelkord {

// A response as the URL cache keeps it. Its URL is empty: it is that of the request which finds it,
// and no URL is written down.
struct StoredResponse {
  URLResponse response;
  Data body;
  // By the wall clock, which may have jumped since.
  WallTime requestedAt{};
  WallTime receivedAt{};
};

using StoredPointer = std::shared_ptr<const StoredResponse>;

// What it takes of the cache's limits: its body and headers, in bytes, and 64 more a header.
std::uint64_t costOf(const StoredResponse& stored);

}  // namespace zelkord
