#include "platform/api/KnownSettings.h"

#include <fmt/core.h>

#include <algorithm>
#include <cmath>

namespace zelkord {
namespace {

bool isWithin(const KnownSetting& setting, const json::value& value) {
  const auto number = asNumber(value);
  return number && *number >= static_cast<double>(setting.range.least) &&
         *number <= static_cast<double>(setting.range.most);
}

bool isWholeWithin(const KnownSetting& setting, const json::value& value) {
  return isWithin(setting, value) && std::floor(*asNumber(value)) == *asNumber(value);
}

bool fits(const KnownSetting& setting, const json::value& value) {
  switch (setting.kind) {
    case SettingKind::Boolean:
      return value.is_bool() || asNumber(value).has_value();
    case SettingKind::Text:
      return value.is_string();
    case SettingKind::Seconds:
      return isWithin(setting, value);
    case SettingKind::Bytes:
    case SettingKind::Choice:
      return isWholeWithin(setting, value);
    case SettingKind::Date:
      return value.is_object() && numberIn(value.get_object(), "$date").has_value();
    case SettingKind::List:
      return value.is_array();
  }
  return false;
}

std::string rangeText(const KnownSetting& setting) {
  if (setting.kind != SettingKind::Bytes && setting.kind != SettingKind::Seconds) return "";
  return fmt::format(", {}from {} to {}", setting.kind == SettingKind::Bytes ? "whole, " : "",
                     setting.range.least, setting.range.most);
}

}  // namespace

const KnownSetting* knownSetting(std::string_view key) {
  const auto* found = std::ranges::find_if(kKnownSettings, [key](const KnownSetting& setting) {
    return setting.isPrefix ? key.starts_with(setting.key) : key == setting.key;
  });
  return found == std::end(kKnownSettings) ? nullptr : found;
}

json::object registeredSettings() {
  json::object values;
  for (const auto& setting : kKnownSettings) {
    if (const auto* flag = std::get_if<bool>(&setting.registered)) values[setting.key] = *flag;
    if (const auto* number = std::get_if<std::uint64_t>(&setting.registered)) {
      values[setting.key] = *number;
    }
  }
  return values;
}

std::string kindText(const KnownSetting& setting) {
  switch (setting.kind) {
    case SettingKind::Boolean:
      return "boolean";
    case SettingKind::Text:
      return "text";
    case SettingKind::Bytes:
      return "bytes";
    case SettingKind::Seconds:
      return "seconds";
    case SettingKind::Choice:
      return fmt::format("{} to {}", setting.range.least, setting.range.most);
    case SettingKind::Date:
      return "date";
    case SettingKind::List:
      return "list";
  }
  return "";
}

std::optional<std::string> settingRefusal(std::string_view key, const json::value* value) {
  const auto* setting = knownSetting(key);
  if (!setting) return "the daemon reads no such setting";
  if (!value || fits(*setting, *value)) return std::nullopt;
  return fmt::format("this setting's value is of the kind: {}{}", kindText(*setting),
                     rangeText(*setting));
}

}  // namespace zelkord
