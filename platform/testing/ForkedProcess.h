#pragma once

#include <sys/wait.h>
#include <unistd.h>

#include "base/FunctionRef.h"

namespace zelkord {

// Runs `body` in a forked process, so that it may drop privileges or limit itself, and gives what
// `body` returned: true for success. Only in tests without other threads.
inline bool succeedsInChild(FunctionRef<bool()> body) {
  const pid_t child = ::fork();
  if (child == 0) ::_exit(body() ? 0 : 1);
  int status = 0;
  return child > 0 && ::waitpid(child, &status, 0) == child && WIFEXITED(status) &&
         WEXITSTATUS(status) == 0;
}

// Gives up the superuser's rights for the rest of the process, so that permissions of files count.
inline bool dropPrivileges() {
  constexpr uid_t kNobody = 65534;
  return ::geteuid() != 0 || (::setgid(kNobody) == 0 && ::setuid(kNobody) == 0);
}

}  // namespace zelkord
