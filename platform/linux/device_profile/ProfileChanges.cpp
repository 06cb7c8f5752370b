#include <tuple>

#include "platform/api/NotificationCenter.h"
#include "platform/linux/device_profile/DeviceProfile.h"
#include "platform/linux/locale_text/LocaleText.h"

namespace zelkord {
namespace {

auto localeParts(const DeviceProfile& profile) {
  return std::tie(profile.locale, profile.preferredLanguages, profile.systemLanguages,
                  profile.temperatureUnit);
}

auto restrictionParts(const DeviceProfile& profile) {
  return std::tie(profile.bookStoreAllowed, profile.mediaStoreAllowed,
                  profile.appInstallationAllowed, profile.diagnosticsSubmissionAllowed);
}

auto mapsParts(const DeviceProfile& profile) {
  return std::tie(profile.mapsMetadata, profile.mapsEnvironment);
}

}  // namespace

std::string countryOf(const DeviceProfile& profile, const std::string& hostLocale) {
  return profile.country ? *profile.country : regionOfLocale(profile.locale.value_or(hostLocale));
}

std::vector<std::string_view> notificationsForChange(const DeviceProfile& before,
                                                     const DeviceProfile& after,
                                                     const std::string& hostLocale) {
  std::vector<std::string_view> names;
  const auto addIf = [&](bool changed, std::string_view name) {
    if (changed) names.push_back(name);
  };
  addIf(countryOf(before, hostLocale) != countryOf(after, hostLocale), kCountryCodeChanged);
  addIf(mapsParts(before) != mapsParts(after), kMapsClientMetadataInvalidated);
  addIf(localeParts(before) != localeParts(after), kCurrentLocaleChanged);
  addIf(before.timeZone != after.timeZone, kTimeZoneChanged);
  addIf(before.managedAccount.value_or(false) != after.managedAccount.value_or(false),
        kAccountStoreChanged);
  addIf(restrictionParts(before) != restrictionParts(after), kEffectiveRestrictionsChanged);
  addIf(before.storefront != after.storefront, kStorefrontChanged);
  addIf(before.subscriptions != after.subscriptions, kSubscriptionsChanged);
  addIf(before.newsAccountStatus.value_or(0) != after.newsAccountStatus.value_or(0),
        kNewsAccountStatusChanged);
  return names;
}

}  // namespace zelkord
