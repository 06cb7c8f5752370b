#pragma once

#include "base/UUID.h"

namespace zelkord {

// Where the rotating user identifier comes from. Any thread.
class UserGUIDSource {
 public:
  virtual ~UserGUIDSource() = default;
  virtual UUID currentUserGUID() = 0;
  // Replaces it at once.
  virtual void reset() = 0;
};

}  // namespace zelkord
