#pragma once

#include <string>

#include "base/Json.h"

namespace zelkord {

// The network proxy service's configuration; how a request is routed is in URLSession.h.
// Answers from memory, on any thread; a change is announced in the notification centre.
class NetworkProxyService {
 public:
  virtual ~NetworkProxyService() = default;
  virtual bool isEnabled() const = 0;
  // Null takes the configuration away.
  virtual void setConfiguration(const json::object* configuration, const std::string& name) = 0;
};

}  // namespace zelkord
