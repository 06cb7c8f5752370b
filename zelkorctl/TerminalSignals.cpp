#include "zelkorctl/TerminalSignals.h"

#include <sys/signalfd.h>
#include <unistd.h>

#include "base/Check.h"

namespace zelkorctl {

TerminalSignals::TerminalSignals() {
  sigset_t watched;
  ::sigemptyset(&watched);
  for (const int signal : {SIGWINCH, SIGTERM, SIGINT, SIGHUP, SIGQUIT}) {
    ::sigaddset(&watched, signal);
  }
  ::pthread_sigmask(SIG_BLOCK, &watched, &before_);
  descriptor_ = ::signalfd(-1, &watched, SFD_CLOEXEC | SFD_NONBLOCK);
  ZK_CHECK(descriptor_ >= 0, "a terminal needs one signal descriptor");
}

TerminalSignals::~TerminalSignals() {
  ::close(descriptor_);
  ::pthread_sigmask(SIG_SETMASK, &before_, nullptr);
}

std::optional<int> TerminalSignals::take() const {
  signalfd_siginfo signal{};
  if (::read(descriptor_, &signal, sizeof signal) != sizeof signal) return std::nullopt;
  return static_cast<int>(signal.ssi_signo);
}

}  // namespace zelkorctl
