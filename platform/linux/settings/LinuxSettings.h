#pragma once

#include <map>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "base/Mutex.h"
#include "platform/api/FileManager.h"
#include "platform/api/Log.h"
#include "platform/api/NotificationCenter.h"
#include "platform/api/SettingsStore.h"
#include "platform/api/WorkQueues.h"
#include "platform/linux/settings/SettingsDatabase.h"
#include "platform/linux/settings/SettingsLayers.h"

namespace zelkord {

// Settings over files: registered defaults, the system's JSON files, the user's database.
//
// Everything is read once, at construction; reads come from memory. A write counts at once and goes
// to the database from a queue; what could not be stored is tried again with the next write and the
// next flush.
//
// Threading: any thread; `flush` blocks for the disk, for at most the busy time-out when somebody
// locks it. Ownership: the queues, the files and the log outlive it. Its end flushes. Errors:
// logged once until something else happens; memory keeps the value.
class LinuxSettings final : public SettingsStore {
 public:
  struct Options {
    std::string databasePath;
    std::vector<std::string> systemFolders;  // most important first
    Duration busyTimeout = 1s;               // real time
  };

  LinuxSettings(Options options, FileManager& files, WorkQueues& queues, LogSink& log);
  ~LinuxSettings() override;

  std::optional<json::value> value(std::string_view key,
                                   std::string_view domain = {}) const override;
  void set(std::string_view key, json::value value, std::string_view domain = {}) override;
  void remove(std::string_view key, std::string_view domain = {}) override;
  void registerDefaults(const json::object& values) override;
  json::object all(std::string_view domain = {}) const override;
  void flush() override;
  Subscription observe(std::string_view key, std::function<void()> changed,
                       std::string_view domain = {}) override;

 private:
  using Place = std::pair<std::string, std::string>;  // domain, key

  SettingsLayers _layers() const;
  void _change(std::string_view key, std::string_view domain, std::optional<json::value> value);
  void _persist();
  std::map<Place, std::optional<std::string>> _takePending();
  std::vector<SettingsDatabase::Change> _everything() const;

  // Queue state.
  const std::unique_ptr<SerialQueue> queue_;
  SettingsDatabase database_ ZK_ON(queue_);

  // Own synchronisation.
  NotificationCenter changes_;
  mutable Mutex mutex_;
  SettingsLayers layers_ ZK_GUARDED_BY(mutex_);
  std::map<Place, std::optional<std::string>> pending_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
