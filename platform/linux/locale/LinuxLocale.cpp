#include "platform/linux/locale/LinuxLocale.h"

#include <tuple>

#include "platform/linux/locale/LocaleFacts.h"
#include "platform/linux/locale/LocaleText.h"

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
      store.observe([this](const DeviceProfile&, const DeviceProfile& after) { refresh(after); });
  refresh(*store.current());
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

void LinuxLocale::refresh(const DeviceProfile& profile) {
  const auto now = host();
  auto snapshot = localeFacts(profile, now);
  auto zone = profile.timeZone.value_or(now.timeZone);
  const MutexLock lock(mutex_);
  state_.snapshot = std::move(snapshot);
  state_.timeZone = std::move(zone);
}

void LinuxLocale::hostChanged(HostLocale host) {
  const auto snapshotBefore = current();
  const auto zoneBefore = timeZoneName();
  const auto regionBefore = regionOfLocale(snapshotBefore.identifier);
  {
    const MutexLock lock(mutex_);
    state_.host = std::move(host);
  }
  const auto profile = store_.current();
  refresh(*profile);
  const auto snapshot = current();
  if (!profile->country && regionOfLocale(snapshot.identifier) != regionBefore) {
    center_.post(std::string(kCountryCodeChanged));
  }
  if (snapshotParts(snapshot) != snapshotParts(snapshotBefore)) {
    center_.post(std::string(kCurrentLocaleChanged));
  }
  if (timeZoneName() != zoneBefore) center_.post(std::string(kTimeZoneChanged));
}

}  // namespace zelkord
