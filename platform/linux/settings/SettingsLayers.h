#pragma once

#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "base/Json.h"

namespace zelkord {

// One object of settings for each domain; "" never occurs.
using SettingsByDomain = std::map<std::string, json::object, std::less<>>;

// All settings of one moment. The user's values win over the system's, those over the registered
// defaults.
//
// A copy shares the layers and costs three counters, so that a reader takes one and looks at it
// without a lock.
struct SettingsLayers {
  using Layer = std::shared_ptr<const SettingsByDomain>;
  Layer registered = std::make_shared<SettingsByDomain>();
  Layer system = registered;
  Layer user = registered;

  // The value that counts, null when there is none. Valid as long as these layers.
  const json::value* find(std::string_view key, std::string_view domain) const;
  json::object all(std::string_view domain) const;
};

// The domain as it is stored: "" is the daemon's own.
std::string_view settingsDomain(std::string_view domain);

// The domain of a system file by its name in the service's folder: "defaults.json" is the daemon's
// own, "DOMAIN.json" another one's. None for other files, the device profile among them.
std::optional<std::string> domainOfSystemFile(std::string_view fileName);

}  // namespace zelkord
