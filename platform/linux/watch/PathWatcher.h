#pragma once

#include <functional>
#include <memory>
#include <string>

#include "base/Subscription.h"
#include "platform/api/Log.h"

namespace zelkord {

// Tells when a file or directory may have changed: written, replaced, created, removed, or one of
// these happened to what a symbolic link leads to. The path and its parents need not exist. Nothing
// polls: one thread sleeps in inotify.
//
// Handlers may run without a change that matters; whoever watches compares.
//
// Threading: any thread. Handlers run on the watcher's own thread and must be brief.
// Ownership: the log outlives it. No handler runs after the end of its subscription or of this;
// both wait for one that runs, except on the watcher's own thread. Errors: without inotify nothing
// is ever told; logged once.
class PathWatcher final {
 public:
  explicit PathWatcher(LogSink& log);
  ~PathWatcher();
  PathWatcher(const PathWatcher&) = delete;
  PathWatcher& operator=(const PathWatcher&) = delete;

  Subscription watch(const std::string& path, std::function<void()> handler);

 private:
  class Loop;
  const std::shared_ptr<Loop> loop_;
};

}  // namespace zelkord
