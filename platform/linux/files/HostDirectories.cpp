#include "platform/linux/files/HostDirectories.h"

#include <pwd.h>

#include <algorithm>

#include "base/RuntimeDirectory.h"

namespace zelkord {
namespace {

std::string inServiceFolder(const std::string& base) {
  return base + "/" + std::string(kServiceFolder);
}

std::string withoutTrailingSlashes(std::string path) {
  while (path.size() > 1 && path.back() == '/') path.pop_back();
  return path;
}

RuntimeEnvironment runtimeEnvironment(const DirectoryEnvironment& environment) {
  return {environment.environment, environment.user, environment.runtimeRoot};
}

std::optional<std::string> absoluteVariable(const DirectoryEnvironment& environment,
                                            const std::string& name) {
  return absolutePathIn(runtimeEnvironment(environment), name);
}

std::string homeBase(const DirectoryEnvironment& environment, const std::string& variable,
                     const std::string& below) {
  if (auto path = absoluteVariable(environment, variable)) return *path;
  const auto home = absoluteVariable(environment, "HOME").value_or(environment.home);
  return withoutTrailingSlashes(home == "/" ? below : home + below);
}

}  // namespace

DirectoryEnvironment DirectoryEnvironment::ofProcess() {
  DirectoryEnvironment result;
  const auto runtime = RuntimeEnvironment::ofProcess();
  result.environment = runtime.environment;
  result.user = runtime.user;
  const auto* account = ::getpwuid(result.user);
  result.home = account && account->pw_dir && account->pw_dir[0] == '/' ? account->pw_dir : "/";
  return result;
}

Directories hostDirectories(const DirectoryEnvironment& environment) {
  return {inServiceFolder(homeBase(environment, "XDG_CACHE_HOME", "/.cache")),
          inServiceFolder(homeBase(environment, "XDG_STATE_HOME", "/.local/state")),
          inServiceFolder(makeRuntimeDirectory(runtimeEnvironment(environment)))};
}

ConfigurationDirectories hostConfigurationDirectories(const DirectoryEnvironment& environment) {
  ConfigurationDirectories result;
  result.user = inServiceFolder(homeBase(environment, "XDG_CONFIG_HOME", "/.config"));
  auto list = environment.environment("XDG_CONFIG_DIRS").value_or("");
  if (list.empty()) list = "/etc/xdg";
  for (std::size_t begin = 0; begin <= list.size();) {
    const auto end = std::min(list.find(':', begin), list.size());
    const auto path = list.substr(begin, end - begin);
    if (!path.empty() && path.front() == '/') {
      result.system.push_back(inServiceFolder(withoutTrailingSlashes(path)));
    }
    begin = end + 1;
  }
  return result;
}

std::string hostDataHome(const DirectoryEnvironment& environment) {
  return homeBase(environment, "XDG_DATA_HOME", "/.local/share");
}

}  // namespace zelkord
