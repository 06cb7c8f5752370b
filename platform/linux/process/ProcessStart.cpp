#include "platform/linux/process/ProcessStart.h"

#include <signal.h>
#include <sys/prctl.h>
#include <sys/stat.h>

#include <algorithm>

namespace zelkord {
namespace {

sigset_t signalsOfLeaving() {
  sigset_t signals;
  ::sigemptyset(&signals);
  ::sigaddset(&signals, SIGINT);
  ::sigaddset(&signals, SIGTERM);
  return signals;
}

}  // namespace

void prepareProcess() {
  const auto leaving = signalsOfLeaving();
  ::pthread_sigmask(SIG_BLOCK, &leaving, nullptr);
  ::umask(0077);
  ::prctl(PR_SET_DUMPABLE, 0, 0, 0, 0);
  raiseDescriptorLimit();
}

void admitSignalsOfLeaving() {
  const auto leaving = signalsOfLeaving();
  ::pthread_sigmask(SIG_UNBLOCK, &leaving, nullptr);
}

rlim_t raiseDescriptorLimit(rlim_t most) {
  rlimit limit{};
  if (::getrlimit(RLIMIT_NOFILE, &limit) != 0) return 0;
  const auto wanted = std::max(limit.rlim_cur, std::min(limit.rlim_max, most));
  const rlimit raised{wanted, limit.rlim_max};
  return ::setrlimit(RLIMIT_NOFILE, &raised) == 0 ? wanted : limit.rlim_cur;
}

}  // namespace zelkord
