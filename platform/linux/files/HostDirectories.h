#pragma once

#include <sys/types.h>

#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "platform/api/FileManager.h"

namespace zelkord {

// The folder of this service in every base directory.
inline constexpr std::string_view kServiceFolder = "com.quenta.zelkord";

// What the base directories depend on; `environment` gives a variable's value.
struct DirectoryEnvironment {
  std::function<std::optional<std::string>(const std::string& name)> environment;
  uid_t user = 0;
  std::string home;                       // of the user's account, for when HOME is unset
  std::string runtimeRoot = "/run/user";  // of the directories that logind makes

  static DirectoryEnvironment ofProcess();
};

// The daemon's own directories by the XDG base directory rules: a relative path counts as unset.
//
// Without XDG_RUNTIME_DIR the runtime directory is in /run/user/UID when that is ours, else in a
// directory of mode 0700 of our own under the temporary directory, which this makes.
Directories hostDirectories(const DirectoryEnvironment& environment);

// The service's folder in XDG_CONFIG_HOME and in each of XDG_CONFIG_DIRS, most important first.
struct ConfigurationDirectories {
  std::string user;
  std::vector<std::string> system;
};
ConfigurationDirectories hostConfigurationDirectories(const DirectoryEnvironment& environment);

// XDG_DATA_HOME, without the service's folder.
std::string hostDataHome(const DirectoryEnvironment& environment);

}  // namespace zelkord
