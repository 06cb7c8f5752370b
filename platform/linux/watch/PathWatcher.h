#pragma once

#include <functional>
#include <memory>
#include <string>

#include "base/Subscription.h"
#include "platform/api/Log.h"

namespace zelkord {

class Loop;

// Tells when a file or directory may have changed: written, replaced, created, removed, or one of
// these happened to what a symbolic link leads to. The path and its parents need not exist. Nothing
// polls: inotify is a watch on a loop, from the first path on.
//
// Handlers may run without a change that matters; whoever watches compares.
//
// Threading: any thread. Handlers run on the loop and must be brief.
// Ownership: loop and log outlive it. No handler runs after the end of its subscription or of this;
// both wait for one that runs, except on the loop. Errors: without inotify nothing is ever told;
// logged once.
class PathWatcher final {
 public:
  PathWatcher(Loop& loop, LogSink& log);
  ~PathWatcher();
  PathWatcher(const PathWatcher&) = delete;
  PathWatcher& operator=(const PathWatcher&) = delete;

  Subscription watch(const std::string& path, std::function<void()> handler);

 private:
  class Inotify;
  const std::shared_ptr<Inotify> inotify_;
};

}  // namespace zelkord
