#include "platform/linux/files/HostDirectories.h"

#include <pwd.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>

namespace zelkord {
namespace {

std::string inServiceFolder(const std::string& base) {
  return base + "/" + std::string(kServiceFolder);
}

std::string withoutTrailingSlashes(std::string path) {
  while (path.size() > 1 && path.back() == '/') path.pop_back();
  return path;
}

std::optional<std::string> absoluteVariable(const DirectoryEnvironment& environment,
                                            const std::string& name) {
  auto value = environment.environment(name);
  if (!value || value->empty() || value->front() != '/') return std::nullopt;
  return withoutTrailingSlashes(std::move(*value));
}

std::string homeBase(const DirectoryEnvironment& environment, const std::string& variable,
                     const std::string& below) {
  if (auto path = absoluteVariable(environment, variable)) return *path;
  const auto home = absoluteVariable(environment, "HOME").value_or(environment.home);
  return withoutTrailingSlashes(home == "/" ? below : home + below);
}

// A directory that belongs to the user and that nobody else may enter.
bool isPrivateDirectory(const std::string& path, uid_t user) {
  struct stat status {};
  return ::lstat(path.c_str(), &status) == 0 && S_ISDIR(status.st_mode) && status.st_uid == user &&
         (status.st_mode & 0077) == 0;
}

// Somebody else may have taken the usual name; then it is a fresh one.
std::string temporaryRuntimeBase(const DirectoryEnvironment& environment) {
  const auto temporary = absoluteVariable(environment, "TMPDIR").value_or("/tmp");
  const auto usual = temporary + "/zelkord-" + std::to_string(environment.user);
  ::mkdir(usual.c_str(), 0700);
  if (isPrivateDirectory(usual, environment.user)) return usual;
  auto fresh = usual + ".XXXXXX";
  return ::mkdtemp(fresh.data()) ? fresh : usual;
}

std::string runtimeBase(const DirectoryEnvironment& environment) {
  if (auto path = absoluteVariable(environment, "XDG_RUNTIME_DIR")) return *path;
  const auto usual = environment.runtimeRoot + "/" + std::to_string(environment.user);
  struct stat status {};
  if (::lstat(usual.c_str(), &status) == 0 && S_ISDIR(status.st_mode) &&
      status.st_uid == environment.user) {
    return usual;
  }
  return temporaryRuntimeBase(environment);
}

}  // namespace

DirectoryEnvironment DirectoryEnvironment::ofProcess() {
  DirectoryEnvironment result;
  result.environment = [](const std::string& name) -> std::optional<std::string> {
    const char* value = std::getenv(name.c_str());
    return value ? std::optional<std::string>(value) : std::nullopt;
  };
  result.user = ::getuid();
  const auto* account = ::getpwuid(result.user);
  result.home = account && account->pw_dir && account->pw_dir[0] == '/' ? account->pw_dir : "/";
  return result;
}

Directories hostDirectories(const DirectoryEnvironment& environment) {
  return {inServiceFolder(homeBase(environment, "XDG_CACHE_HOME", "/.cache")),
          inServiceFolder(homeBase(environment, "XDG_STATE_HOME", "/.local/state")),
          inServiceFolder(runtimeBase(environment))};
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
