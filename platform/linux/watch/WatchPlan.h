#pragma once

#include <sys/inotify.h>

#include <cstdint>
#include <string>
#include <vector>

#include "base/Namespace.h"

namespace zelkord {

// A place to watch for one path, and the name there that matters; "" is every name.
struct WatchSpot {
  std::string path;
  std::string name;

  friend bool operator==(const WatchSpot&, const WatchSpot&) = default;
};

// Not IN_MODIFY: a file that is being written is looked at when its writer closes it.
inline constexpr std::uint32_t kWatchedEvents = IN_CREATE | IN_CLOSE_WRITE | IN_MOVED_TO |
                                                IN_MOVED_FROM | IN_DELETE | IN_ATTRIB |
                                                IN_DELETE_SELF | IN_MOVE_SELF;

// Where events about the path can come from, as the file system is now: what the path leads to, the
// path's name in its directory, that directory's name in its own one; or the nearest directory that
// exists, where the rest has to appear.
std::vector<WatchSpot> watchPlan(const std::string& path);

}  // namespace zelkord
