#pragma once

#include <memory>
#include <string>

#include "platform/api/Clock.h"
#include "platform/api/LocationService.h"
#include "platform/api/SettingsStore.h"
#include "platform/linux/device_profile/DeviceProfileStore.h"
#include "platform/linux/location/LocationSource.h"

namespace zelkord {

// Where the device is: the profile's location, else a provider's.
//
// A manager that updates gets the profile's location once for each start and once for each change
// of it. Without one a provider runs until the manager stops. Nothing is told while location is
// switched off or not authorised.
//
// The authorisation is the setting "ZLKLocationAuthorization", which a grant writes, else the
// profile's; every bundle has the same one.
//
// Threading: any thread; delegates are called on their manager's queue.
// Ownership: everything given outlives it; its managers may not outlive it.
class LinuxLocation final : public LocationService {
 public:
  LinuxLocation(DeviceProfileStore& store, SettingsStore& settings, const Clock& clock,
                LocationSourceFactory provider);
  ~LinuxLocation() override;

  bool isEnabledSystemWide() const override;
  LocationAuthorization authorization(const std::string& bundlePath) const override;
  void setAuthorization(const std::string& bundlePath, LocationAuthorization status) override;
  std::unique_ptr<LocationManager> makeManager(const std::string& bundlePath,
                                               const LocationOptions& options,
                                               std::weak_ptr<LocationDelegate> delegate,
                                               WorkQueue& queue) override;

 private:
  class Client;
  class Manager;
  struct Shared;

  void profileChanged(const DeviceProfile& before, const DeviceProfile& after);

  const std::shared_ptr<Shared> shared_;
  Subscription profileChanges_;
};

}  // namespace zelkord
