#include "platform/api/SettingsStore.h"

#include "base/Check.h"
#include "platform/api/KnownSettings.h"

namespace zelkord {
namespace {

// A setting that is read stands in the table, and so in the documentation.
std::optional<json::value> ownSetting(const SettingsStore& settings, std::string_view key) {
  ZK_CHECK(knownSetting(key), "the setting stands in the table");
  return settings.value(key);
}

}  // namespace

std::string settingName(std::string_view key, std::string_view domain) {
  std::string name(domain.empty() ? kSettingsDomain : domain);
  // No domain has a line break in its name.
  return name.append("\n").append(key);
}

bool boolSetting(const SettingsStore& settings, std::string_view key, bool fallback) {
  const auto value = ownSetting(settings, key);
  if (!value) return fallback;
  if (value->is_bool()) return value->get_bool();
  const auto number = asNumber(*value);
  return number ? *number != 0 : fallback;
}

std::string stringSetting(const SettingsStore& settings, std::string_view key) {
  const auto value = ownSetting(settings, key);
  return value && value->is_string() ? std::string(value->get_string()) : std::string();
}

std::uint64_t unsignedSetting(const SettingsStore& settings, std::string_view key,
                              std::uint64_t fallback) {
  const auto value = ownSetting(settings, key);
  if (!value) return fallback;
  if (const auto* number = value->if_uint64()) return *number;
  const auto number = asNumber(*value);
  if (!number) return fallback;
  constexpr double kLimit = 9.2e18;
  return *number <= 0 ? 0 : static_cast<std::uint64_t>(*number < kLimit ? *number : kLimit);
}

}  // namespace zelkord
