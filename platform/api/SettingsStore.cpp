#include "platform/api/SettingsStore.h"

#include <algorithm>
#include <cmath>

namespace zelkord {
namespace {

std::optional<double> numberOf(const SettingsStore& settings, const KnownSetting& setting) {
  const auto value = settings.value(setting.key);
  return value ? asNumber(*value) : std::nullopt;
}

std::uint64_t registeredNumber(const KnownSetting& setting) {
  const auto* number = std::get_if<std::uint64_t>(&setting.registered);
  return number ? *number : 0;
}

}  // namespace

std::string settingName(std::string_view key, std::string_view domain) {
  std::string name(domain.empty() ? kSettingsDomain : domain);
  // No domain has a line break in its name.
  return name.append("\n").append(key);
}

bool boolSetting(const SettingsStore& settings, SettingKey<SettingKind::Boolean> key) {
  const auto& setting = key.row();
  const auto value = settings.value(setting.key);
  if (value && value->is_bool()) return value->get_bool();
  if (const auto number = value ? asNumber(*value) : std::nullopt) return *number != 0;
  const auto* registered = std::get_if<bool>(&setting.registered);
  return registered && *registered;
}

std::string stringSetting(const SettingsStore& settings, SettingKey<SettingKind::Text> key) {
  const auto value = settings.value(key.row().key);
  return value && value->is_string() ? std::string(value->get_string()) : std::string();
}

std::uint64_t bytesSetting(const SettingsStore& settings, SettingKey<SettingKind::Bytes> key) {
  const auto& setting = key.row();
  const auto number = numberOf(settings, setting);
  if (!number) return registeredNumber(setting);
  return static_cast<std::uint64_t>(std::clamp(*number, static_cast<double>(setting.range.least),
                                               static_cast<double>(setting.range.most)));
}

double secondsSetting(const SettingsStore& settings, SettingKey<SettingKind::Seconds> key) {
  const auto& setting = key.row();
  return numberOf(settings, setting).value_or(static_cast<double>(registeredNumber(setting)));
}

std::optional<std::uint64_t> choiceSetting(const SettingsStore& settings,
                                           SettingKey<SettingKind::Choice> key) {
  const auto& setting = key.row();
  const auto number = numberOf(settings, setting);
  if (!number || std::floor(*number) != *number) return std::nullopt;
  if (*number < static_cast<double>(setting.range.least)) return std::nullopt;
  if (*number > static_cast<double>(setting.range.most)) return std::nullopt;
  return static_cast<std::uint64_t>(*number);
}

json::array listSetting(const SettingsStore& settings, SettingKey<SettingKind::List> key) {
  auto value = settings.value(key.row().key);
  return value && value->is_array() ? std::move(value->get_array()) : json::array();
}

}  // namespace zelkord
