#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "platform/api/Platform.h"
#include "platform/linux/files/HostDirectories.h"

namespace zelkord {

class DeviceProfileStore;
class LaunchEventStreams;
class LinuxWorkQueues;
class PathWatcher;

// What the command line decides.
struct LinuxPlatformOptions {
  std::string logFile;  // empty: the journal, else zelkord.log in the state directory
  LogLevel logLevel = LogLevel::Default;
  std::optional<Duration> exitWhenIdle;  // scaled
  double clockRate = 1;                  // 1 to 100000
  bool usesSessionBus = true;
  // Where directories come from; the process's own environment unless a test gives another.
  DirectoryEnvironment environment = DirectoryEnvironment::ofProcess();
};

// The host services on Linux, built once by `main`.
//
// The process's end runs: counters saved, settings flushed, donations written, log flushed. After
// SIGINT or SIGTERM it comes within two seconds, then without what is not done.
//
// Threading: made and destroyed on the main thread; the services on any.
// Ownership: outlives the daemon's objects.
// Errors: a host service that is missing is logged once and answers nothing.
class LinuxPlatform final {
 public:
  // Null when the state directory cannot be had; `error` then says why, for people: another daemon
  // uses it ("already running: ..."), or it cannot be made. Null too when a directory belongs to
  // somebody else, and for a log file that is none. Until the state directory is ours, what exists
  // is left alone.
  static std::unique_ptr<LinuxPlatform> make(const LinuxPlatformOptions& options, Error* error);
  ~LinuxPlatform();
  LinuxPlatform(const LinuxPlatform&) = delete;
  LinuxPlatform& operator=(const LinuxPlatform&) = delete;

  Platform& platform();

  // For host services that are built on these.
  DeviceProfileStore& deviceProfile();
  PathWatcher& pathWatcher();
  LaunchEventStreams& launchEvents();
  LinuxWorkQueues& queues();

 private:
  struct Services;
  explicit LinuxPlatform(std::unique_ptr<Services> services);

  const std::unique_ptr<Services> services_;
};

}  // namespace zelkord
