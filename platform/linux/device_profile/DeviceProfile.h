#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "base/Json.h"
#include "platform/api/DeviceManagement.h"
#include "platform/api/LocationService.h"

namespace zelkord {

// What an integrator says about the device and its user; what is not said is absent.
struct DeviceProfile {
  struct Location {
    double latitude = 0;
    double longitude = 0;
    double horizontalAccuracy = 0;  // metres
    int type = 1;
    double age = 0;  // seconds, when the profile was read

    friend bool operator==(const Location&, const Location&) = default;
  };

  // One subscription: the dictionary as written, and the three members that are for us.
  struct Subscription {
    std::string provider;
    std::string bundleIdentifier;  // empty: none
    std::string domain;            // empty: none
    double expires = 0;            // seconds since 1970
    json::object dictionary;       // without those three

    friend bool operator==(const Subscription&, const Subscription&) = default;
  };

  std::optional<std::string> productType, productName, buildVersion;
  std::optional<std::string> locale;                             // "en_US"
  std::vector<std::string> preferredLanguages, systemLanguages;  // BCP 47; empty: absent
  std::optional<std::string> temperatureUnit, timeZone, country;
  std::optional<std::string> keyboardInputMode;
  std::optional<double> screenScale;
  std::optional<Location> location;
  std::optional<bool> locationServicesEnabled;
  std::optional<int> locationAuthorization;
  std::optional<bool> managedAccount;
  std::optional<RestrictionValue> bookStoreAllowed, diagnosticsSubmissionAllowed;
  std::optional<bool> mediaStoreAllowed, appInstallationAllowed;
  std::optional<std::string> storefront;
  std::optional<int> newsAccountStatus;
  std::optional<bool> networkProxyEnabled;
  std::vector<Subscription> subscriptions;  // by provider name
  std::optional<std::string> mapsSession, mapsMetadata, mapsEnvironment;

  friend bool operator==(const DeviceProfile&, const DeviceProfile&) = default;
};

// Reads a profile. Whatever cannot be used counts as absent and gives one line in `problems`; keys
// that are not known are passed over.
DeviceProfile parseDeviceProfile(std::string_view text, std::vector<std::string>& problems);

// The country that the profile names, else that of its locale, else that of the host's.
std::string countryOf(const DeviceProfile& profile, const std::string& hostLocale);

// The platform notifications that a change of the profile stands for, each once.
std::vector<std::string_view> notificationsForChange(const DeviceProfile& before,
                                                     const DeviceProfile& after,
                                                     const std::string& hostLocale);

}  // namespace zelkord
