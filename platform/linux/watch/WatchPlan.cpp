#include "platform/linux/watch/WatchPlan.h"

#include <unistd.h>

#include <tuple>
#include <utility>

namespace zelkord {
namespace {

bool pathExists(const std::string& path) { return ::access(path.c_str(), F_OK) == 0; }

std::pair<std::string, std::string> splitPath(const std::string& path) {
  const auto slash = path.rfind('/');
  return {slash == 0 ? "/" : path.substr(0, slash), path.substr(slash + 1)};
}

}  // namespace

std::vector<WatchSpot> watchPlan(const std::string& path) {
  std::vector<WatchSpot> plan;
  if (path.empty() || path.front() != '/') return plan;
  if (pathExists(path)) plan.push_back({path, ""});
  auto [directory, name] = splitPath(path);
  while (directory != "/" && !pathExists(directory))
    std::tie(directory, name) = splitPath(directory);
  plan.push_back({directory, name});
  if (directory == "/") return plan;
  const auto [above, directoryName] = splitPath(directory);
  plan.push_back({above, directoryName});
  return plan;
}

}  // namespace zelkord
