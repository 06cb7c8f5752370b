#pragma once

#include <string>
#include <vector>

#include "platform/api/FileManager.h"
#include "platform/api/Log.h"
#include "platform/linux/settings/SettingsLayers.h"

namespace zelkord {

// Reads the system's settings from the service's folders, most important first. A file that is not
// one JSON object of at most 1 MiB is left out and logged.
SettingsByDomain readSystemSettings(const std::vector<std::string>& folders, FileManager& files,
                                    const Logger& log);

}  // namespace zelkord
