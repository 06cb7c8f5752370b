#pragma once

#include <cstdint>
#include <string>

#include "platform/linux/url_cache/Digest.h"
#include "platform/linux/url_cache/StoredResponse.h"

namespace zelkord {

// What the index knows of a stored response: how to find it and what it takes.
struct CacheEntry {
  std::int64_t id = 0;      // from 1, never used again while the index lives
  Digest url{};             // cacheKeyOf
  std::string vary;         // varyNames
  Digest variant{};         // variantOf
  std::uint64_t cost = 0;   // costOf, in bytes
  std::uint64_t used = 0;   // when it was used last: the greater the later
  std::uint64_t scope = 0;  // of CacheScopes
};

// An entry with its response.
struct CacheRecord {
  CacheEntry entry;
  StoredPointer stored;
};

}  // namespace zelkord
