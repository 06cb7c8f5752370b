#pragma once

#include <chrono>
#include <optional>
#include <string>
#include <string_view>

#include "base/Error.h"
#include "base/Json.h"

namespace zelkorctl {

// How the daemon's attempts to fetch the bag went, for when something fails for want of it.

// Whether that is what the error means.
bool saysNoBag(const std::optional<zelkor::Error>& error);

// What the daemon's status says of the bag; nothing when it says nothing.
std::optional<zelkor::json::object> bagInStatus(std::string_view status);

inline double secondsSince1970() {
  return std::chrono::duration<double>(std::chrono::system_clock::now().time_since_epoch()).count();
}

// "fetching URL failed 12 s ago: REASON; next attempt in 18 s", printable.
std::string bagFetchText(const zelkor::json::object& bag, double now = secondsSince1970());

}  // namespace zelkorctl
