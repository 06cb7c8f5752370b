#pragma once

#include <memory>
#include <set>
#include <string>
#include <vector>

#include "platform/api/FileManager.h"
#include "platform/api/Log.h"
#include "platform/api/WorkQueues.h"
#include "platform/linux/device_profile/DeviceProfileStore.h"
#include "platform/linux/watch/PathWatcher.h"

namespace zelkord {

// Keeps the profile in step with its file: the first of the candidates that exists. No file is an
// empty profile.
//
// The file is read at construction and, after the watcher told of a change, 100 ms later, so that a
// burst of events is read once; the wait is not prolonged by further events.
//
// Threading: any thread; reading and announcing happen on the loader's queue.
// Ownership: everything given outlives it.
// Errors: what cannot be used is logged once and counts as absent.
class DeviceProfileLoader final {
 public:
  // Candidates are absolute paths, most important first. `watcher` may be null: then nothing is
  // watched.
  DeviceProfileLoader(std::vector<std::string> candidates, DeviceProfileStore& store,
                      FileManager& files, WorkQueues& queues, PathWatcher* watcher, LogSink& log);
  ~DeviceProfileLoader();

  // Something about the files may have changed.
  void noteChange();

 private:
  void _arm();
  void _reload();
  DeviceProfile _read() ZK_REQUIRES(queue_);
  void _complain(const std::string& path, const std::vector<std::string>& problems);

  // Fixed after construction.
  const std::vector<std::string> candidates_;
  DeviceProfileStore& store_;
  FileManager& files_;
  const Logger log_;
  const std::unique_ptr<SerialQueue> queue_;

  // Queue state.
  Subscription timer_ ZK_ON(queue_);
  std::set<std::string> complaints_ ZK_ON(queue_);

  std::vector<Subscription> watches_;
};

}  // namespace zelkord
