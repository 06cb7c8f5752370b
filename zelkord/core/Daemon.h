#pragma once

#include <atomic>
#include <memory>
#include <optional>

#include "base/Error.h"
#include "base/Subscription.h"
#include "platform/api/Platform.h"

namespace zelkord {

class Assembly;
class Diagnostics;
class ZelkorService;

// The daemon on some platform: builds the object graph in its order and serves.
//
// States: starting (until `start` has returned), serving, left (the process ends).
// Threading: constructed and started on the main thread.
// Ownership: the platform outlives it.
class Daemon final {
 public:
  explicit Daemon(Platform& platform);
  ~Daemon();

  // An error when the service's name or socket cannot be had; the daemon then does not serve.
  std::optional<Error> start();

  Assembly& assembly() { return *assembly_; }

 private:
  void _makeServices();
  std::optional<Error> _listen();
  void _handleLaunchEvents();
  void _warm();
  void _leave(const char* name);
  void _finishRecording();
  void _handleSignals();

  Platform& platform_;
  std::unique_ptr<Assembly> assembly_;
  std::shared_ptr<ZelkorService> service_;
  std::shared_ptr<Diagnostics> diagnostics_;
  std::unique_ptr<SerialQueue> eventQueue_;
  Subscription launchEvents_;
  Subscription notifyEvents_;
  Subscription interrupt_;
  Subscription terminate_;
  std::atomic<bool> leaving_ = false;
  Subscription longestFinish_;  // set by whoever set `leaving_`
};

}  // namespace zelkord
