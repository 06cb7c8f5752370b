#include "platform/linux/process/SystemRandom.h"

#include <sys/random.h>

#include <cerrno>

#include "base/Check.h"

namespace zelkord {

void SystemRandom::fill(void* bytes, std::size_t count) {
  auto* to = static_cast<char*>(bytes);
  while (count > 0) {
    const auto got = ::getrandom(to, count, 0);
    ZK_CHECK(got >= 0 || errno == EINTR, "no random numbers from the kernel");
    if (got <= 0) continue;
    to += got;
    count -= static_cast<std::size_t>(got);
  }
}

}  // namespace zelkord
