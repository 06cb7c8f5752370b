#include "platform/linux/url_cache/StoredResponse.h"

namespace zelkord {

namespace {

// Of a header that has nothing in it: two strings.
constexpr std::uint64_t kHeaderCost = 64;

}  // namespace

std::uint64_t costOf(const StoredResponse& stored) {
  std::uint64_t cost = stored.body.size();
  for (const auto& [name, value] : stored.response.headers) {
    cost += name.size() + value.size() + kHeaderCost;
  }
  return cost;
}

}  // namespace zelkord
