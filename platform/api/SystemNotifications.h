#pragma once

#include <string_view>

#include "base/Namespace.h"

namespace zelkord {

// Notifications by name that every process of the user may hear.
// Threading: any thread; never waits.
class SystemNotifications {
 public:
  virtual ~SystemNotifications() = default;
  virtual void post(std::string_view name) = 0;
};

}  // namespace zelkord
