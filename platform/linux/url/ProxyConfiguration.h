#pragma once

#include <memory>
#include <string>
#include <vector>

#include "base/Namespace.h"

namespace zelkord {

// Where routed requests go: those to a listed host through that CONNECT proxy.
struct ProxyConfiguration {
  std::string proxy;               // "http://host:port" or "https://host:port"
  std::vector<std::string> hosts;  // compared without regard to ASCII case
};

// Who knows the proxy of the moment.
// Threading: any thread, never blocks.
class ProxyConfigurationSource {
 public:
  virtual ~ProxyConfigurationSource() = default;
  // Null: the service is disabled or has no configuration.
  virtual std::shared_ptr<const ProxyConfiguration> proxyConfiguration() const = 0;
};

}  // namespace zelkord
