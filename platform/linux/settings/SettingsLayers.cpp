#include "platform/linux/settings/SettingsLayers.h"

#include "platform/api/SettingsStore.h"

namespace zelkord {

const json::value* SettingsLayers::find(std::string_view key, std::string_view domain) const {
  for (const auto* layer : {&user, &system, &registered}) {
    const auto found = (*layer)->find(domain);
    if (found == (*layer)->end()) continue;
    if (const auto* value = found->second.if_contains(key)) return value;
  }
  return nullptr;
}

json::object SettingsLayers::all(std::string_view domain) const {
  json::object merged;
  for (const auto* layer : {&registered, &system, &user}) {
    const auto found = (*layer)->find(domain);
    if (found == (*layer)->end()) continue;
    for (const auto& [key, value] : found->second) merged.insert_or_assign(key, value);
  }
  return merged;
}

std::string_view settingsDomain(std::string_view domain) {
  return domain.empty() ? kSettingsDomain : domain;
}

std::optional<std::string> domainOfSystemFile(std::string_view fileName) {
  constexpr std::string_view kSuffix = ".json";
  if (fileName == "defaults.json") return std::string(kSettingsDomain);
  if (!fileName.ends_with(kSuffix) || fileName.starts_with('.') || fileName == "device.json") {
    return std::nullopt;
  }
  fileName.remove_suffix(kSuffix.size());
  if (fileName == kSettingsDomain) return std::nullopt;
  return std::string(fileName);
}

}  // namespace zelkord
