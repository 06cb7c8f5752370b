#include "platform/linux/device_profile/DeviceProfile.h"

#include <fmt/format.h>

#include <algorithm>
#include <limits>

#include "platform/linux/device_profile/ProfileValues.h"

namespace zelkord {
namespace {

constexpr double kAnyPositive = std::numeric_limits<double>::max();

// Takes over the values of one JSON object, noting those that cannot be used.
class ProfileObject {
 public:
  ProfileObject(const json::object& object, std::string prefix, std::vector<std::string>& problems)
      : object_(object), prefix_(std::move(prefix)), problems_(problems) {}

  template <typename Target, typename Read>
  void take(std::string_view key, Target& target, Read read) const {
    const auto* value = object_.if_contains(key);
    if (!value) return;
    if (auto good = read(*value)) {
      target = std::move(*good);
    } else {
      note(key);
    }
  }
  void note(std::string_view key) const {
    problems_.push_back(fmt::format("\"{}{}\" cannot be used", prefix_, key));
  }
  const json::value* find(std::string_view key) const { return object_.if_contains(key); }

 private:
  const json::object& object_;
  const std::string prefix_;
  std::vector<std::string>& problems_;
};

auto within(double low, double high) {
  return [=](const json::value& value) { return profile::numberWithin(value, low, high); };
}

auto integer(int low, int high) {
  return [=](const json::value& value) { return profile::integerWithin(value, low, high); };
}

std::optional<RestrictionValue> restriction(const json::value& value) {
  if (value.is_bool()) return value.get_bool() ? RestrictionValue::Yes : RestrictionValue::No;
  const auto number = profile::integerWithin(value, 0, 2);
  return number ? std::optional(static_cast<RestrictionValue>(*number)) : std::nullopt;
}

// The type that a fix of that accuracy most likely has.
int typeOfAccuracy(double metres) { return metres <= 100 ? 1 : metres <= 1000 ? 4 : 6; }

std::optional<DeviceProfile::Location> location(const json::value& value,
                                                std::vector<std::string>& problems) {
  const auto* object = value.if_object();
  if (!object) return std::nullopt;
  const ProfileObject reader(*object, "location.", problems);
  std::optional<double> latitude, longitude;
  reader.take("latitude", latitude, within(-90, 90));
  reader.take("longitude", longitude, within(-180, 180));
  if (!latitude || !longitude) return std::nullopt;
  DeviceProfile::Location result{*latitude, *longitude};
  reader.take("horizontal_accuracy", result.horizontalAccuracy, within(0, kAnyPositive));
  result.type = typeOfAccuracy(result.horizontalAccuracy);
  reader.take("type", result.type, integer(1, 9));
  reader.take("age", result.age, within(0, kMaximumSeconds));
  return result;
}

std::optional<DeviceProfile::Subscription> subscription(std::string_view provider,
                                                        const json::value& value) {
  const auto* object = value.if_object();
  const auto expires = object ? numberIn(*object, "expires") : std::nullopt;
  if (!expires) return std::nullopt;
  DeviceProfile::Subscription result;
  result.provider = provider;
  result.bundleIdentifier = stringIn(*object, "bundle_identifier").value_or("");
  result.domain = stringIn(*object, "domain").value_or("");
  if (result.bundleIdentifier.empty() && result.domain.empty()) return std::nullopt;
  result.expires = *expires;
  for (const auto& [key, member] : *object) {
    if (key != "bundle_identifier" && key != "domain" && key != "expires") {
      result.dictionary[key] = member;
    }
  }
  return result;
}

void takeSubscriptions(const ProfileObject& reader, DeviceProfile& profile,
                       std::vector<std::string>& problems) {
  const auto* value = reader.find("subscriptions");
  if (!value) return;
  if (!value->is_object()) return reader.note("subscriptions");
  const ProfileObject entries(value->get_object(), "subscriptions.", problems);
  for (const auto& [provider, entry] : value->get_object()) {
    if (auto good = subscription(provider, entry)) {
      profile.subscriptions.push_back(std::move(*good));
    } else {
      entries.note(provider);
    }
  }
  std::sort(profile.subscriptions.begin(), profile.subscriptions.end(),
            [](const auto& a, const auto& b) { return a.provider < b.provider; });
}

void takeMaps(const ProfileObject& reader, DeviceProfile& profile,
              std::vector<std::string>& problems) {
  const auto* value = reader.find("maps");
  if (!value) return;
  if (!value->is_object()) return reader.note("maps");
  const ProfileObject maps(value->get_object(), "maps.", problems);
  maps.take("session", profile.mapsSession, profile::nonEmptyText);
  maps.take("metadata", profile.mapsMetadata, profile::base64);
  maps.take("environment", profile.mapsEnvironment, profile::nonEmptyText);
}

void takeDevice(const ProfileObject& reader, DeviceProfile& profile) {
  reader.take("product_type", profile.productType, profile::nonEmptyText);
  reader.take("product_name", profile.productName, profile::nonEmptyText);
  reader.take("build_version", profile.buildVersion, profile::nonEmptyText);
  reader.take("locale", profile.locale, profile::localeIdentifier);
  reader.take("preferred_languages", profile.preferredLanguages, profile::languageTags);
  reader.take("system_languages", profile.systemLanguages, profile::languageTags);
  reader.take("temperature_unit", profile.temperatureUnit, profile::temperatureUnit);
  reader.take("time_zone", profile.timeZone, profile::timeZone);
  reader.take("country", profile.country, profile::countryCode);
  reader.take("keyboard_input_mode", profile.keyboardInputMode, profile::plainText);
  reader.take("screen_scale", profile.screenScale, within(0, kAnyPositive));
}

void takeUser(const ProfileObject& reader, DeviceProfile& profile) {
  reader.take("location_services_enabled", profile.locationServicesEnabled, profile::flag);
  reader.take("location_authorization", profile.locationAuthorization, integer(0, 4));
  reader.take("managed_account", profile.managedAccount, profile::flag);
  reader.take("book_store_allowed", profile.bookStoreAllowed, restriction);
  reader.take("media_store_allowed", profile.mediaStoreAllowed, profile::flag);
  reader.take("app_installation_allowed", profile.appInstallationAllowed, profile::flag);
  reader.take("diagnostics_submission_allowed", profile.diagnosticsSubmissionAllowed, restriction);
  reader.take("storefront", profile.storefront, profile::nonEmptyText);
  reader.take("news_account_status", profile.newsAccountStatus,
              integer(0, std::numeric_limits<int>::max()));
  reader.take("network_proxy_enabled", profile.networkProxyEnabled, profile::flag);
}

}  // namespace

DeviceProfile parseDeviceProfile(std::string_view text, std::vector<std::string>& problems) {
  std::string problem = "not a JSON object";
  const auto value = parseJson(text, &problem);
  DeviceProfile profile;
  if (!value || !value->is_object()) {
    problems.push_back("not usable: " + problem);
    return profile;
  }
  const ProfileObject reader(value->get_object(), "", problems);
  takeDevice(reader, profile);
  takeUser(reader, profile);
  reader.take("location", profile.location,
              [&](const json::value& at) { return location(at, problems); });
  takeSubscriptions(reader, profile, problems);
  takeMaps(reader, profile, problems);
  return profile;
}

}  // namespace zelkord
