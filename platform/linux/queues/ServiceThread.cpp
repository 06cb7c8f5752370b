#include "platform/linux/queues/ServiceThread.h"

#include <pthread.h>
#include <signal.h>

#include <initializer_list>

namespace zelkord {

namespace {
constinit thread_local bool tlsIsServiceThread = false;
}  // namespace

bool isServiceThread() { return tlsIsServiceThread; }

void beginServiceThread(const char* name) {
  tlsIsServiceThread = true;
  ::pthread_setname_np(::pthread_self(), name);
  sigset_t blocked;
  ::sigfillset(&blocked);
  for (const int fault : {SIGSEGV, SIGBUS, SIGFPE, SIGILL, SIGABRT, SIGTRAP, SIGSYS, SIGPROF}) {
    ::sigdelset(&blocked, fault);
  }
  ::pthread_sigmask(SIG_BLOCK, &blocked, nullptr);
}

}  // namespace zelkord
