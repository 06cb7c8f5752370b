#pragma once

#include <memory>
#include <string>
#include <vector>

#include "base/Mutex.h"
#include "platform/api/Clock.h"
#include "platform/api/LocationService.h"
#include "platform/api/SettingsStore.h"
#include "platform/api/WorkQueues.h"
#include "platform/linux/device_profile/DeviceProfileStore.h"
#include "platform/linux/location/LocationSource.h"

namespace zelkord {

class LocationClient;

// Where the device is: the profile's location, else a provider's.
//
// A manager that updates gets the profile's location once for each start and once for each change
// of it. Without one a provider runs until the manager stops; one that ends is tried again, not
// before `kProviderRetry` and only for somebody who has asked since (LocationClient). Nothing is
// told, and no provider runs, while location is switched off or not authorised.
//
// The authorisation is the setting "ZLKLocationAuthorization", which a grant writes, else the
// profile's; but a refusal by either wins. Every bundle has the same one. Managers are told of a
// change wherever it was made.
//
// Threading: any thread; delegates are called on their manager's queue, providers made and ended on
// the service's.
// Ownership: everything given outlives it; its managers may not outlive it.
class LinuxLocation final : public LocationService {
 public:
  LinuxLocation(DeviceProfileStore& store, SettingsStore& settings, const Clock& clock,
                WorkQueues& queues, LocationSourceFactory provider);
  ~LinuxLocation() override;

  bool isEnabledSystemWide() const override;
  LocationAuthorization authorization(const std::string& bundlePath) const override;
  void setAuthorization(const std::string& bundlePath, LocationAuthorization status) override;
  std::unique_ptr<LocationManager> makeManager(const std::string& bundlePath,
                                               const LocationOptions& options,
                                               std::weak_ptr<LocationDelegate> delegate,
                                               WorkQueue& queue) override;

 private:
  class Manager;
  struct Permission {
    bool enabled = false;
    LocationAuthorization status = 0;
    friend bool operator==(const Permission&, const Permission&) = default;
  };

  Permission _permission() const;
  void _permissionMayHaveChanged();
  void _profileChanged(const DeviceProfile& before, const DeviceProfile& after);
  std::vector<std::shared_ptr<LocationClient>> _liveClients();

  // Fixed after construction.
  DeviceProfileStore& store_;
  SettingsStore& settings_;
  const Clock& clock_;
  const LocationSourceFactory provider_;
  const std::unique_ptr<SerialQueue> queue_;

  // Own synchronisation.
  Mutex tellingMutex_;
  Permission told_ ZK_GUARDED_BY(tellingMutex_);
  Mutex clientsMutex_;
  std::vector<std::weak_ptr<LocationClient>> clients_ ZK_GUARDED_BY(clientsMutex_);

  Subscription profileChanges_;
  Subscription settingChanges_;
};

}  // namespace zelkord
