#pragma once

#include <functional>
#include <map>
#include <memory>
#include <string>

#include "base/Mutex.h"
#include "base/Subscription.h"
#include "platform/api/NotificationCenter.h"
#include "platform/linux/device_profile/DeviceProfile.h"

namespace zelkord {

// The device profile that counts now, and the host's locale, which stands for the one that the
// profile may not name. Replacing either announces what changed by it.
//
// Threading: any thread; `replace` one at a time, `replaceHostLocale` likewise. Observers and
// notifications come from the thread that replaces, after the new value counts.
// Ownership: the notification centre outlives it.
class DeviceProfileStore final {
 public:
  using Snapshot = std::shared_ptr<const DeviceProfile>;
  using Observer = std::function<void(const DeviceProfile& before, const DeviceProfile& after)>;

  DeviceProfileStore(NotificationCenter& center, std::string hostLocale)
      : center_(center), hostLocale_(std::move(hostLocale)) {}

  Snapshot current() const;
  void replace(DeviceProfile profile);
  // True when the country changed by it, which is the caller's to announce.
  bool replaceHostLocale(const std::string& locale);
  // For changes that have no notification of their own.
  Subscription observe(Observer observer);

 private:
  struct Observers {
    Mutex mutex;
    int nextId ZK_GUARDED_BY(mutex) = 0;
    std::map<int, std::shared_ptr<const Observer>> byId ZK_GUARDED_BY(mutex);
  };

  NotificationCenter& center_;
  const std::shared_ptr<Observers> observers_ = std::make_shared<Observers>();
  mutable Mutex mutex_;
  std::string hostLocale_ ZK_GUARDED_BY(mutex_);
  Snapshot current_ ZK_GUARDED_BY(mutex_) = std::make_shared<DeviceProfile>();
};

}  // namespace zelkord
