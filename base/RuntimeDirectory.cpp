#include "base/RuntimeDirectory.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>

namespace zelkor {
namespace {

bool isOwnDirectory(const std::string& path, uid_t user, mode_t forbidden) {
  struct stat status {};
  return ::lstat(path.c_str(), &status) == 0 && S_ISDIR(status.st_mode) && status.st_uid == user &&
         (status.st_mode & forbidden) == 0;
}

bool isPrivateDirectory(const std::string& path, uid_t user) {
  return isOwnDirectory(path, user, 0077);
}

std::string temporaryDirectory(const RuntimeEnvironment& environment) {
  return absolutePathIn(environment, "TMPDIR").value_or("/tmp");
}

std::string usualName(const RuntimeEnvironment& environment) {
  return "zelkord-" + std::to_string(environment.user);
}

std::vector<std::string> privateTemporaryDirectories(const RuntimeEnvironment& environment) {
  const auto usual = usualName(environment);
  std::vector<std::string> found;
  std::error_code problem;
  std::filesystem::directory_iterator entries(temporaryDirectory(environment), problem);
  for (; !problem && entries != std::filesystem::directory_iterator(); entries.increment(problem)) {
    const auto name = entries->path().filename().string();
    const bool ours = name == usual || name.starts_with(usual + ".");
    if (ours && isPrivateDirectory(entries->path(), environment.user)) {
      found.push_back(entries->path());
    }
  }
  std::sort(found.begin(), found.end());  // the usual name is the shortest
  return found;
}

std::optional<std::string> hostRuntimeDirectory(const RuntimeEnvironment& environment) {
  if (auto path = absolutePathIn(environment, "XDG_RUNTIME_DIR")) return path;
  auto usual = environment.runtimeRoot + "/" + std::to_string(environment.user);
  if (isOwnDirectory(usual, environment.user, 0)) return usual;
  return std::nullopt;
}

}  // namespace

RuntimeEnvironment RuntimeEnvironment::ofProcess() {
  RuntimeEnvironment result;
  result.environment = [](const std::string& name) -> std::optional<std::string> {
    const char* value = std::getenv(name.c_str());
    return value ? std::optional<std::string>(value) : std::nullopt;
  };
  result.user = ::getuid();
  return result;
}

std::optional<std::string> absolutePathIn(const RuntimeEnvironment& environment,
                                          const std::string& name) {
  auto path = environment.environment(name);
  if (!path || path->empty() || path->front() != '/') return std::nullopt;
  while (path->size() > 1 && path->back() == '/') path->pop_back();
  return path;
}

std::vector<std::string> findRuntimeDirectories(const RuntimeEnvironment& environment) {
  if (auto path = hostRuntimeDirectory(environment)) return {*std::move(path)};
  return privateTemporaryDirectories(environment);
}

std::string makeRuntimeDirectory(const RuntimeEnvironment& environment) {
  if (auto path = hostRuntimeDirectory(environment)) return *std::move(path);
  const auto usual = temporaryDirectory(environment) + "/" + usualName(environment);
  ::mkdir(usual.c_str(), 0700);
  const auto found = privateTemporaryDirectories(environment);
  if (!found.empty()) return found.front();
  auto fresh = usual + ".XXXXXX";
  return ::mkdtemp(fresh.data()) ? fresh : usual;
}

}  // namespace zelkor
