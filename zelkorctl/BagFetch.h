#pragma once

#include <chrono>
#include <optional>
#include <string>
#include <string_view>

#include "base/Error.h"
#include "base/Json.h"

namespace zelkorctl {

// How the daemon's attempts to fetch the bag went, for when something fails for want of it.

// Whether the error may mean that.
bool mayMeanNoBag(const std::optional<zelkor::Error>& error);

// What the daemon's status says of a bag that is missing; nothing when there is one, or when it
// says nothing.
std::optional<zelkor::json::object> missingBagIn(std::string_view status);

inline double secondsSince1970() {
  return std::chrono::duration<double>(std::chrono::system_clock::now().time_since_epoch()).count();
}

// "fetching URL failed 12 s ago: REASON; next attempt in 18 s", printable.
std::string bagFetchText(const zelkor::json::object& bag, double now = secondsSince1970());

}  // namespace zelkorctl
