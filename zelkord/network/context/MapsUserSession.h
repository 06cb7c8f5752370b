#pragma once

#include <optional>
#include <string>

#include "base/Namespace.h"

namespace zelkord {

// The user session that is shared with maps, as requests carry it and replies tell it.
struct MapsUserSession {
  // The identifier of the session; none when maps gave an entity without one.
  std::optional<std::string> sessionIDString;

  // What a reply hands to the client: the same text as the request's header.
  const std::optional<std::string>& sessionEntityString() const { return sessionIDString; }

  friend bool operator==(const MapsUserSession&, const MapsUserSession&) = default;
};

}  // namespace zelkord
