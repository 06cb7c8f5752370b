#pragma once

#include <string>

#include "base/Mutex.h"
#include "platform/api/LocaleService.h"
#include "platform/api/MapsService.h"
#include "platform/api/RandomSource.h"
#include "platform/linux/device_profile/DeviceProfileStore.h"

namespace zelkord {

// Maps services from the device profile; the country is the locale's unless the profile names one.
// The session is the profile's, which a reset leaves alone, else a random identifier.
//
// Threading: any thread. Ownership: everything given outlives it.
class LinuxMaps final : public MapsService {
 public:
  LinuxMaps(const DeviceProfileStore& store, const LocaleService& locale, RandomSource& random);

  std::string countryCode() const override;
  std::optional<std::string> clientMetadata() const override;
  std::optional<std::string> environmentName() const override;
  std::optional<std::optional<std::string>> userSession(bool reset) override;

 private:
  std::string _freshSession();

  const DeviceProfileStore& store_;
  const LocaleService& locale_;
  RandomSource& random_;
  Mutex mutex_;
  std::string session_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
