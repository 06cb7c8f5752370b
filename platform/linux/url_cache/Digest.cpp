#include "platform/linux/url_cache/Digest.h"

#include <openssl/evp.h>
#include <openssl/sha.h>

#include <cstdint>
#include <memory>

#include "base/Check.h"

namespace zelkord {

Digest digestOf(std::string_view bytes) {
  Digest digest{};
  SHA256(reinterpret_cast<const unsigned char*>(bytes.data()), bytes.size(), digest.data());
  return digest;
}

Digest digestOfParts(std::initializer_list<std::string_view> parts) {
  const std::unique_ptr<EVP_MD_CTX, decltype(&EVP_MD_CTX_free)> context(EVP_MD_CTX_new(),
                                                                        &EVP_MD_CTX_free);
  bool done = context && EVP_DigestInit_ex(context.get(), EVP_sha256(), nullptr) == 1;
  for (const auto part : parts) {
    const std::uint64_t size = part.size();
    done = done && EVP_DigestUpdate(context.get(), &size, sizeof size) == 1 &&
           EVP_DigestUpdate(context.get(), part.data(), part.size()) == 1;
  }
  Digest digest{};
  done = done && EVP_DigestFinal_ex(context.get(), digest.data(), nullptr) == 1;
  ZK_CHECK(done, "a digest can be made");
  return digest;
}

std::string_view bytesOf(const Digest& digest) {
  return {reinterpret_cast<const char*>(digest.data()), digest.size()};
}

std::optional<Digest> digestFromBytes(std::string_view bytes) {
  Digest digest{};
  if (bytes.size() != digest.size()) return std::nullopt;
  std::memcpy(digest.data(), bytes.data(), bytes.size());
  return digest;
}

Digest cacheKeyOf(std::string_view url, std::uint64_t scope) {
  const auto whole = url.substr(0, url.find('#'));
  if (scope == 0) return digestOf(whole);
  return digestOfParts({{reinterpret_cast<const char*>(&scope), sizeof scope}, whole});
}

}  // namespace zelkord
