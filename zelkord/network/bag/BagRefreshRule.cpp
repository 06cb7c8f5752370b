#include "zelkord/network/bag/BagRefreshRule.h"

namespace zelkord {

BagRefreshDecision decideBagRefresh(const json::object* bag, WallTime now,
                                    FunctionRef<std::string_view()> currentURL) {
  using Reason = BagRefreshDecision::Reason;
  if (!bag) return {Reason::NoURL};
  if (bag->contains(kBagRefreshDisabledKey)) return {Reason::Disabled};
  const double remaining = numberIn(*bag, kBagExpirationKey).value_or(0) - secondsSince1970(now);
  // Written so that not-a-number is due too.
  if (!(remaining >= secondsOf(kBagRefreshMargin))) return {Reason::Expired, remaining};
  const auto* stored = bag->if_contains(kBagURLKey);
  if (!stored || !stored->is_string()) return {Reason::NoURL, remaining};
  const std::string_view storedURL(stored->get_string());
  if (storedURL == currentURL()) return {Reason::UpToDate, remaining};
  return {Reason::URLChanged, remaining, std::string(storedURL)};
}

}  // namespace zelkord
