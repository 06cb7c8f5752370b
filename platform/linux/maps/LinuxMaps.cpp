#include "platform/linux/maps/LinuxMaps.h"

#include "platform/api/RandomUUID.h"
#include "platform/linux/locale_text/LocaleText.h"

namespace zelkord {

LinuxMaps::LinuxMaps(const DeviceProfileStore& store, const LocaleService& locale,
                     RandomSource& random)
    : store_(store), locale_(locale), random_(random) {
  const MutexLock lock(mutex_);
  session_ = _freshSession();
}

std::string LinuxMaps::_freshSession() { return randomUUID(random_).string(); }

std::string LinuxMaps::countryCode() const {
  const auto profile = store_.current();
  return profile->country ? *profile->country : regionOfLocale(locale_.current().identifier);
}

std::optional<std::string> LinuxMaps::clientMetadata() const {
  return store_.current()->mapsMetadata;
}

std::optional<std::string> LinuxMaps::environmentName() const {
  return store_.current()->mapsEnvironment;
}

std::optional<std::optional<std::string>> LinuxMaps::userSession(bool reset) {
  const MutexLock lock(mutex_);
  if (reset) session_ = _freshSession();
  const auto given = store_.current()->mapsSession;
  return std::optional<std::string>(given ? *given : session_);
}

}  // namespace zelkord
