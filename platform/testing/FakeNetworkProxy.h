#pragma once

#include <map>
#include <string>

#include "base/Mutex.h"
#include "platform/api/NetworkProxyService.h"

namespace zelkord {

// A network proxy service that a test enables, and the configurations that it was given.
//
// Threading: any thread, `enabled` on the thread that drives the timeline.
class FakeNetworkProxy final : public NetworkProxyService {
 public:
  bool enabled = false;

  bool isEnabled() const override { return enabled; }
  void setConfiguration(const json::object* configuration, const std::string& name) override {
    const MutexLock lock(mutex_);
    ++changes_;
    configurations_.erase(name);
    if (configuration) configurations_[name] = *configuration;
  }

  // By name; what was taken away is absent.
  std::map<std::string, json::object> configurations() const {
    const MutexLock lock(mutex_);
    return configurations_;
  }
  int changes() const {
    const MutexLock lock(mutex_);
    return changes_;
  }

 private:
  mutable Mutex mutex_;
  std::map<std::string, json::object> configurations_ ZK_GUARDED_BY(mutex_);
  int changes_ ZK_GUARDED_BY(mutex_) = 0;
};

}  // namespace zelkord
