#include "sandbox/Background.h"

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>

namespace sandbox {
namespace {

[[noreturn]] void endWith(pid_t child, int end) {
  char byte = 0;
  ssize_t count = 0;
  do {
    count = ::read(end, &byte, 1);
  } while (count < 0 && errno == EINTR);
  if (count == 1) ::_exit(0);
  int status = 0;
  const bool exited = ::waitpid(child, &status, 0) == child && WIFEXITED(status);
  ::_exit(exited && WEXITSTATUS(status) != 0 ? WEXITSTATUS(status) : 1);
}

}  // namespace

Outcome<Background> Background::begin() {
  int ends[2];
  if (::pipe2(ends, O_CLOEXEC) != 0) return Failure{"cannot make a pipe"};
  const pid_t child = ::fork();
  if (child < 0) return Failure{"cannot make a process"};
  if (child > 0) {
    ::close(ends[1]);
    endWith(child, ends[0]);
  }
  ::close(ends[0]);
  ::setsid();
  return Background(ends[1]);
}

void Background::ready() {
  const int nothing = ::open("/dev/null", O_RDWR | O_CLOEXEC);
  for (const int stream : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) ::dup2(nothing, stream);
  if (nothing > STDERR_FILENO) ::close(nothing);
  // The caller may have been killed meanwhile.
  [[maybe_unused]] const auto written = ::write(end_, "", 1);
  ::close(end_);
}

}  // namespace sandbox
