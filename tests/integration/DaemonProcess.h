#pragma once

#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "platform/linux/LinuxPlatform.h"
#include "platform/linux/process/ProcessStart.h"
#include "platform/testing/TemporaryDirectory.h"
#include "zelkord/core/Daemon.h"

namespace zelkord {

// The daemon on the real host, in a process of its own, with all its directories under `root`. Only
// in tests that have no threads when it is made. Its end kills what is left of it.
class DaemonProcess final {
 public:
  // `early` runs in the new process before the daemon is built.
  explicit DaemonProcess(const TemporaryDirectory& root, const std::function<void()>& early = {})
      : child_(::fork()) {
    if (child_ == 0) _serve(root, early);
  }
  ~DaemonProcess() {
    if (child_ <= 0) return;
    ::kill(child_, SIGKILL);
    ::waitpid(child_, nullptr, 0);
  }
  DaemonProcess(const DaemonProcess&) = delete;
  DaemonProcess& operator=(const DaemonProcess&) = delete;

  // Where clients find it.
  static std::string socketOf(const TemporaryDirectory& root) {
    return root / "XDG_RUNTIME_DIR/com.quenta.zelkord/socket";
  }
  static std::string stateOf(const TemporaryDirectory& root) {
    return root / "XDG_STATE_HOME/com.quenta.zelkord";
  }

  pid_t pid() const { return child_; }
  void send(int signal) const { ::kill(child_, signal); }
  // The status with which it left by itself; none when it did not within `limit`.
  std::optional<int> waitForEnd(std::chrono::milliseconds limit) {
    const auto deadline = std::chrono::steady_clock::now() + limit;
    for (;;) {
      int status = 0;
      if (::waitpid(child_, &status, WNOHANG) == child_) {
        child_ = 0;
        return WIFEXITED(status) ? std::optional(WEXITSTATUS(status)) : std::nullopt;
      }
      if (std::chrono::steady_clock::now() > deadline) return std::nullopt;
      ::usleep(1000);
    }
  }

 private:
  [[noreturn]] static void _serve(const TemporaryDirectory& root,
                                  const std::function<void()>& early) {
    prepareProcess();
    if (early) early();
    LinuxPlatformOptions options;
    options.usesSessionBus = false;
    options.logFile = root / "log";
    options.environment.environment = [&](const std::string& name) -> std::optional<std::string> {
      return name.starts_with("XDG_") ? std::optional(root / name) : std::nullopt;
    };
    Error error;
    const auto host = LinuxPlatform::make(options, &error);
    if (!host) ::_exit(10);
    Daemon daemon(host->platform());
    if (daemon.start()) ::_exit(11);
    admitSignalsOfLeaving();
    host->platform().process.runMainLoop();
    ::_exit(12);
  }

  pid_t child_;
};

}  // namespace zelkord
