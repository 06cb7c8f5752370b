#include "platform/linux/process/SystemRandom.h"

#include <string.h>
#include <sys/random.h>

#include <array>
#include <cerrno>

#include "base/Check.h"

namespace zelkord {
namespace {

void fillFromKernel(char* to, std::size_t count) {
  while (count > 0) {
    const auto got = ::getrandom(to, count, 0);
    ZK_CHECK(got >= 0 || errno == EINTR, "no random numbers from the kernel");
    if (got <= 0) continue;
    to += got;
    count -= static_cast<std::size_t>(got);
  }
}

// The kernel gives up to 256 bytes at once, uninterrupted.
constexpr std::size_t kStored = 256;
constexpr std::size_t kSmall = 64;

// Front to back: bytes that were handed out, bytes that were not.
struct Store {
  std::array<char, kStored> bytes{};
  std::size_t handedOut = kStored;

  void take(char* to, std::size_t count) {
    if (kStored - handedOut < count) {
      fillFromKernel(bytes.data(), kStored);
      handedOut = 0;
    }
    char* const from = bytes.data() + handedOut;
    ::memcpy(to, from, count);
    ::explicit_bzero(from, count);
    handedOut += count;
  }
};

}  // namespace

void SystemRandom::fill(void* bytes, std::size_t count) {
  thread_local Store store;
  auto* const to = static_cast<char*>(bytes);
  return count <= kSmall ? store.take(to, count) : fillFromKernel(to, count);
}

}  // namespace zelkord
