#include "platform/linux/device_profile/DeviceProfileStore.h"

#include <utility>

namespace zelkord {

DeviceProfileStore::Snapshot DeviceProfileStore::current() const {
  const MutexLock lock(mutex_);
  return current_;
}

void DeviceProfileStore::replace(DeviceProfile profile) {
  const auto after = std::make_shared<const DeviceProfile>(std::move(profile));
  const auto before = current();
  if (*before == *after) return;
  std::string hostLocale;
  {
    const MutexLock lock(mutex_);
    current_ = after;
    hostLocale = hostLocale_;
  }
  std::map<int, std::shared_ptr<const Observer>> observers;
  {
    const MutexLock lock(observers_->mutex);
    observers = observers_->byId;
  }
  for (const auto& entry : observers) (*entry.second)(*before, *after);
  for (const auto name : notificationsForChange(*before, *after, hostLocale)) {
    center_.post(std::string(name));
  }
}

// Both kinds of change look at the other's value under one lock: no pair of them hides a country.
bool DeviceProfileStore::replaceHostLocale(const std::string& locale) {
  const MutexLock lock(mutex_);
  const auto before = std::exchange(hostLocale_, locale);
  return countryOf(*current_, before) != countryOf(*current_, locale);
}

Subscription DeviceProfileStore::observe(Observer observer) {
  int id = 0;
  {
    const MutexLock lock(observers_->mutex);
    id = observers_->nextId++;
    observers_->byId[id] = std::make_shared<const Observer>(std::move(observer));
  }
  return Subscription([weak = std::weak_ptr(observers_), id] {
    const auto observers = weak.lock();
    if (!observers) return;
    const MutexLock lock(observers->mutex);
    observers->byId.erase(id);
  });
}

}  // namespace zelkord
