#include "platform/linux/url_cache/CacheScopes.h"

#include <algorithm>

namespace zelkord {
namespace {

// Requests of an identity that ended longer ago are not under way any more.
constexpr std::size_t kMaximumEndedScopes = 64;

}  // namespace

CacheScopes::Scope CacheScopes::of(const std::string& identity) {
  if (std::ranges::find(ended_, identity) != ended_.end()) return kEnded;
  const auto [found, isNew] = live_.try_emplace(identity, last_ + 1);
  if (isNew) ++last_;
  return found->second;
}

bool CacheScopes::isLive(Scope scope) const {
  return std::ranges::any_of(live_, [scope](const auto& live) { return live.second == scope; });
}

std::vector<CacheScopes::Scope> CacheScopes::end(const std::string& identity) {
  std::vector<Scope> ended;
  for (const auto& name : {identity, std::string()}) {
    const auto found = live_.find(name);
    if (found == live_.end()) continue;
    ended.push_back(found->second);
    live_.erase(found);
  }
  if (!identity.empty()) ended_.push_back(identity);
  if (ended_.size() > kMaximumEndedScopes) ended_.pop_front();
  return ended;
}

}  // namespace zelkord
