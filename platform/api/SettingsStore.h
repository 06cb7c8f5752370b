#pragma once

#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "base/Json.h"
#include "base/Subscription.h"
#include "platform/api/KnownSettings.h"

namespace zelkord {

// The domain of the daemon's own settings; "" means it too.
inline constexpr std::string_view kSettingsDomain = "com.quenta.zelkord";

// Settings by domain and key: registered defaults, overridden by the system's file, overridden by
// the user's store. A date is an object {"$date": seconds since 1970}.
//
// Threading: any thread; reads come from memory (well under a microsecond).
// Errors: a store that cannot be read counts as empty, one that cannot be written is logged once;
// the value then holds until the process ends.
class SettingsStore {
 public:
  virtual ~SettingsStore() = default;
  virtual std::optional<json::value> value(std::string_view key,
                                           std::string_view domain = {}) const = 0;
  virtual void set(std::string_view key, json::value value, std::string_view domain = {}) = 0;
  virtual void remove(std::string_view key, std::string_view domain = {}) = 0;
  virtual void registerDefaults(const json::object& values) = 0;
  // Every key that has a value, with the value that counts.
  virtual json::object all(std::string_view domain = {}) const = 0;
  // Returns when everything set so far is on disk.
  virtual void flush() = 0;
  // `changed` runs after each `set` and `remove` of that key, on the thread of whoever wrote.
  virtual Subscription observe(std::string_view key, std::function<void()> changed,
                               std::string_view domain = {}) = 0;
};

// The name of a setting among those of all domains: what stores announce a change under.
std::string settingName(std::string_view key, std::string_view domain);

// What a setting of the daemon's own domain says: its value when that is of its kind, else what is
// registered, without that false or an empty text. Bytes beyond the range are its nearest, and
// without their fraction; a choice beyond it is none.
bool boolSetting(const SettingsStore& settings, SettingKey<SettingKind::Boolean> key);
std::string stringSetting(const SettingsStore& settings, SettingKey<SettingKind::Text> key);
std::uint64_t bytesSetting(const SettingsStore& settings, SettingKey<SettingKind::Bytes> key);
double secondsSetting(const SettingsStore& settings, SettingKey<SettingKind::Seconds> key);
std::optional<std::uint64_t> choiceSetting(const SettingsStore& settings,
                                           SettingKey<SettingKind::Choice> key);
json::array listSetting(const SettingsStore& settings, SettingKey<SettingKind::List> key);

}  // namespace zelkord
