#pragma once

#include <functional>
#include <memory>
#include <string>

#include "base/Mutex.h"
#include "platform/api/LocaleService.h"
#include "platform/api/NotificationCenter.h"
#include "platform/linux/device_profile/DeviceProfileStore.h"
#include "platform/linux/locale/HostLocale.h"

namespace zelkord {

// Locale and time zone: the profile's over the host's. A change of the profile is announced by the
// profile store, one of the host by `hostChanged`.
//
// Threading: any thread; reads come from memory. `hostChanged` one at a time.
// Ownership: the store and the notification centre outlive it.
class LinuxLocale final : public LocaleService {
 public:
  LinuxLocale(DeviceProfileStore& store, HostLocale host, NotificationCenter& center);

  LocaleSnapshot current() const override;
  std::string timeZoneName() const override;

  // The host says something else now; announces what changed by it, on the caller's thread.
  void hostChanged(HostLocale host);
  HostLocale host() const;

 private:
  struct State {
    HostLocale host;
    LocaleSnapshot snapshot;
    std::string timeZone;
  };

  void _refresh();

  NotificationCenter& center_;
  DeviceProfileStore& store_;
  Mutex refreshMutex_;  // of two refreshes the later one sees all that came before
  mutable Mutex mutex_;
  State state_ ZK_GUARDED_BY(mutex_);
  Subscription profileChanges_;
};

}  // namespace zelkord
