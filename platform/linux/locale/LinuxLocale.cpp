#include "platform/linux/locale/LinuxLocale.h"

#include <tuple>

#include "platform/linux/locale/LocaleFacts.h"
#include "platform/linux/locale_text/LocaleText.h"

namespace zelkord {
namespace {

auto snapshotParts(const LocaleSnapshot& s) {
  return std::tie(s.identifier, s.calendar, s.measurementSystem, s.hourFormat, s.temperatureUnit,
                  s.preferredTemperatureUnit, s.preferredLanguages, s.effectiveSystemLanguage);
}

}  // namespace

LinuxLocale::LinuxLocale(DeviceProfileStore& store, HostLocale host, NotificationCenter& center)
    : center_(center), store_(store) {
  {
    const MutexLock lock(mutex_);
    state_.host = std::move(host);
  }
  profileChanges_ =
      store.observe([this](const DeviceProfile&, const DeviceProfile&) { _refresh(); });
  _refresh();
}

LocaleSnapshot LinuxLocale::current() const {
  const MutexLock lock(mutex_);
  return state_.snapshot;
}

std::string LinuxLocale::timeZoneName() const {
  const MutexLock lock(mutex_);
  return state_.timeZone;
}

HostLocale LinuxLocale::host() const {
  const MutexLock lock(mutex_);
  return state_.host;
}

void LinuxLocale::_refresh() {
  const MutexLock refreshing(refreshMutex_);
  const auto profile = store_.current();
  const auto now = host();
  auto snapshot = localeFacts(*profile, now);
  auto zone = profile->timeZone.value_or(now.timeZone);
  const MutexLock lock(mutex_);
  state_.snapshot = std::move(snapshot);
  state_.timeZone = std::move(zone);
}

// What changed is told by comparing what the host says with what it said before, under the same
// profile: a profile that changes meanwhile announces its own part.
void LinuxLocale::hostChanged(HostLocale host) {
  const auto before = this->host();
  {
    const MutexLock lock(mutex_);
    state_.host = host;
  }
  _refresh();
  const bool countryChanged = store_.replaceHostLocale(host.locale);
  const auto profile = store_.current();
  // All of it counts before the first of these is posted.
  if (countryChanged) center_.post(std::string(kCountryCodeChanged));
  if (snapshotParts(localeFacts(*profile, host)) != snapshotParts(localeFacts(*profile, before))) {
    center_.post(std::string(kCurrentLocaleChanged));
  }
  if (!profile->timeZone && host.timeZone != before.timeZone) {
    center_.post(std::string(kTimeZoneChanged));
  }
}

}  // namespace zelkord
