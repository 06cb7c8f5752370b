#include "platform/linux/system/ServiceThread.h"

#include <pthread.h>
#include <signal.h>

#include <utility>

namespace zelkord {
namespace {

constinit thread_local bool tlsMayBeLentLoops = false;

// Blocks signals on this thread, and on those that it starts meanwhile.
class SignalsBlocked {
 public:
  SignalsBlocked() {
    sigset_t blocked;
    ::sigfillset(&blocked);
    for (const int fault : {SIGSEGV, SIGBUS, SIGFPE, SIGILL, SIGABRT, SIGTRAP, SIGSYS, SIGPROF}) {
      ::sigdelset(&blocked, fault);
    }
    ::pthread_sigmask(SIG_BLOCK, &blocked, &before_);
  }
  ~SignalsBlocked() { ::pthread_sigmask(SIG_SETMASK, &before_, nullptr); }
  SignalsBlocked(const SignalsBlocked&) = delete;
  SignalsBlocked& operator=(const SignalsBlocked&) = delete;

 private:
  sigset_t before_;
};

}  // namespace

std::thread startServiceThread(const char* name, ThreadWork work, std::function<void()> body) {
  const SignalsBlocked blocked;
  return std::thread([name, work, body = std::move(body)] {
    tlsMayBeLentLoops = work == ThreadWork::Tasks;
    ::pthread_setname_np(::pthread_self(), name);
    body();
  });
}

bool mayBeLentLoops() { return tlsMayBeLentLoops; }

ThreadWork setThreadWork(ThreadWork work) {
  const bool did = std::exchange(tlsMayBeLentLoops, work == ThreadWork::Tasks);
  return did ? ThreadWork::Tasks : ThreadWork::Loop;
}

}  // namespace zelkord
