#pragma once

#include <string>
#include <string_view>

#include "base/FunctionRef.h"
#include "base/Json.h"
#include "base/Time.h"

namespace zelkord {

// What the daemon adds to a stored bag, and the key that a bag may have.
inline constexpr std::string_view kBagExpirationKey = "__expiration";  // seconds since 1970
inline constexpr std::string_view kBagURLKey = "__bagurl";             // bag-cache URL when stored
inline constexpr std::string_view kBagRefreshDisabledKey = "__refresh_disabled";  // any value

inline constexpr Duration kBagLifetime = 14400s;
// A bag is fetched anew when less than this is left of its lifetime.
inline constexpr Duration kBagRefreshMargin = 600s;

struct BagRefreshDecision {
  enum class Reason { Disabled, Expired, URLChanged, UpToDate, NoURL };

  Reason reason = Reason::NoURL;
  double remaining = 0;   // Expired: seconds left, negative once it is over
  std::string storedURL;  // URLChanged

  bool isRequired() const { return reason != Reason::Disabled && reason != Reason::UpToDate; }
};

// Whether a stored bag is due. A value of the wrong type counts as absent, an absent expiration as
// 1970. Null, no bag, is due for want of a URL. `currentURL` is asked only when all depends on it.
BagRefreshDecision decideBagRefresh(const json::object* bag, WallTime now,
                                    FunctionRef<std::string_view()> currentURL);

}  // namespace zelkord
