#pragma once

#include <functional>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "base/Mutex.h"
#include "platform/api/Log.h"
#include "platform/api/WorkQueues.h"
#include "platform/linux/bus/SystemBusListener.h"
#include "platform/linux/locale/HostLocale.h"
#include "platform/linux/watch/PathWatcher.h"

namespace zelkord {

// Reads the host's locale and time zone anew when they may have changed: the time zone's files
// (watched), the signals of org.freedesktop.timedate1, and those of org.freedesktop.locale1, whose
// variables then stand for the environment's.
//
// Threading: `changed` runs on the watcher's queue.
// Ownership: everything given outlives it.
// Errors: without a system bus only the files are watched, until there is one; logged once.
class HostLocaleWatcher final {
 public:
  HostLocaleWatcher(HostLocaleSources sources, std::function<void(HostLocale)> changed,
                    WorkQueues& queues, Loop& host, PathWatcher& watcher, LogSink& log);
  ~HostLocaleWatcher();

 private:
  void _connected(sd_bus* bus);
  void _away(const std::string& problem);
  void _readLocale(sd_bus* bus);
  void _localeArrived(std::map<std::string, std::string> variables);
  void _noteChange();
  void _reread();

  // Fixed after construction.
  const HostLocaleSources sources_;
  const std::function<void(HostLocale)> changed_;
  const Logger log_;
  const std::unique_ptr<SerialQueue> queue_;

  // Queue state.
  Subscription timer_ ZK_ON(queue_);
  // What locale1 said last; empty until it says something.
  std::map<std::string, std::string> variables_ ZK_ON(queue_);

  // The host loop's.
  bool complained_ = false;
  bool wasConnected_ = false;

  struct BusCallbacks;
  std::vector<Subscription> watches_;
  SystemBusListener bus_;
};

// The variables of locale1's property, "LANG=de_DE.UTF-8" and the like.
std::map<std::string, std::string> localeVariables(const std::vector<std::string>& assignments);

}  // namespace zelkord
