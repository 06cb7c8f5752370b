#include "platform/linux/proxy/LinuxNetworkProxy.h"

#include "platform/linux/proxy/ProxyRules.h"

namespace zelkord {

LinuxNetworkProxy::LinuxNetworkProxy(const DeviceProfileStore& store, LogSink& log)
    : store_(store), log_(log, "") {}

void LinuxNetworkProxy::setConfiguration(const json::object* configuration,
                                         const std::string& name) {
  std::string problem;
  auto parsed = configuration ? parseProxyConfiguration(*configuration, &problem) : nullptr;
  if (configuration && !parsed)
    log_.error("proxy configuration of {} is ignored: {}", name, problem);
  const MutexLock lock(mutex_);
  if (parsed) {
    byName_[name] = std::move(parsed);
  } else {
    byName_.erase(name);
  }
}

std::shared_ptr<const ProxyConfiguration> LinuxNetworkProxy::proxyConfiguration() const {
  if (!store_.current()->networkProxyEnabled.value_or(false)) return nullptr;
  const MutexLock lock(mutex_);
  return byName_.empty() ? nullptr : byName_.begin()->second;
}

}  // namespace zelkord
