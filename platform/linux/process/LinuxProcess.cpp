#include "platform/linux/process/LinuxProcess.h"

#include <malloc.h>
#include <unistd.h>

#include <utility>

#include "platform/linux/queues/LinuxWorkQueues.h"

namespace zelkord {

namespace {
constinit thread_local bool tlsThreadExits = false;
}  // namespace

LinuxProcess::LinuxProcess(LinuxWorkQueues& queues) : queues_(queues) {}

void LinuxProcess::atExit(std::function<void()> hook) {
  const MutexLock lock(mutex_);
  hooks_.push_back(std::move(hook));
}

void LinuxProcess::exit(int status) {
  if (tlsThreadExits) ::_exit(status);
  tlsThreadExits = true;
  std::vector<std::function<void()>> hooks;
  bool isFirst = false;
  {
    const MutexLock lock(mutex_);
    isFirst = !std::exchange(exiting_, true);
    hooks.swap(hooks_);
  }
  if (!isFirst) {
    for (;;) ::pause();
  }
  for (const auto& hook : hooks) hook();
  ::_exit(status);
}

void LinuxProcess::runMainLoop() { queues_.runMainLoop(); }

void LinuxProcess::releaseFreeMemory() { ::malloc_trim(0); }

}  // namespace zelkord
