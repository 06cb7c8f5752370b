#pragma once

#include <map>
#include <memory>
#include <string>

#include "base/Mutex.h"
#include "platform/api/Log.h"
#include "platform/api/NetworkProxyService.h"
#include "platform/linux/device_profile/DeviceProfileStore.h"
#include "platform/linux/url/ProxyConfiguration.h"

namespace zelkord {

// The network proxy service: enabled by the device profile, and configured by whoever gives a
// configuration under a name. With several names the first in their order counts.
//
// Threading: any thread. Ownership: everything given outlives it.
// Errors: a configuration that cannot be used is logged and counts as none.
class LinuxNetworkProxy final : public NetworkProxyService, public ProxyConfigurationSource {
 public:
  LinuxNetworkProxy(const DeviceProfileStore& store, LogSink& log);

  // The profile says so and there is a configuration.
  bool isEnabled() const override { return proxyConfiguration() != nullptr; }
  void setConfiguration(const json::object* configuration, const std::string& name) override;
  std::shared_ptr<const ProxyConfiguration> proxyConfiguration() const override;

 private:
  const DeviceProfileStore& store_;
  const Logger log_;
  mutable Mutex mutex_;
  std::map<std::string, std::shared_ptr<const ProxyConfiguration>> byName_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
