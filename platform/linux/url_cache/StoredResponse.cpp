#include "platform/linux/url_cache/StoredResponse.h"

namespace zelkord {

std::uint64_t costOf(const StoredResponse& stored) {
  std::uint64_t cost = stored.body.size();
  for (const auto& [name, value] : stored.response.headers) cost += name.size() + value.size();
  return cost;
}

}  // namespace zelkord
