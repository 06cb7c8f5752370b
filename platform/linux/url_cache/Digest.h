#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <initializer_list>
#include <optional>
#include <string_view>

#include "base/Namespace.h"

namespace zelkord {

// A SHA-256.
using Digest = std::array<unsigned char, 32>;

Digest digestOf(std::string_view bytes);
// Of several texts, each after its length, so that no two lists have the same bytes.
Digest digestOfParts(std::initializer_list<std::string_view> parts);

std::string_view bytesOf(const Digest& digest);
// None for bytes of another length.
std::optional<Digest> digestFromBytes(std::string_view bytes);

// Under which a URL's responses are kept within a scope: a digest of both, without the fragment.
Digest cacheKeyOf(std::string_view url, std::uint64_t scope = 0);

// For hash tables: a digest is as random as it gets.
struct DigestHash {
  std::size_t operator()(const Digest& digest) const {
    std::size_t hash = 0;
    std::memcpy(&hash, digest.data(), sizeof hash);
    return hash;
  }
};

}  // namespace zelkord
