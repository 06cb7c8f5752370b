#include "platform/linux/queues/Parker.h"

#include <linux/futex.h>
#include <sys/syscall.h>
#include <time.h>
#include <unistd.h>

#include <cerrno>

namespace zelkord {

namespace {

constexpr std::uint32_t kParkerEmpty = 0;
constexpr std::uint32_t kParkerWoken = 1;
constexpr std::uint32_t kParkerAsleep = 2;

timespec parkerDeadline(Duration limit) {
  timespec time{};
  ::clock_gettime(CLOCK_MONOTONIC, &time);
  const auto total = std::chrono::nanoseconds(time.tv_nsec) + limit;
  const auto seconds = std::chrono::floor<std::chrono::seconds>(total);
  time.tv_sec += seconds.count();
  time.tv_nsec = (total - seconds).count();
  return time;
}

// False when the deadline has passed.
bool parkerSleep(std::atomic<std::uint32_t>& state, const timespec* deadline) {
  const auto result = ::syscall(SYS_futex, &state, FUTEX_WAIT_BITSET_PRIVATE, kParkerAsleep,
                                deadline, nullptr, FUTEX_BITSET_MATCH_ANY);
  return !(result < 0 && errno == ETIMEDOUT);
}

}  // namespace

bool Parker::tryTake() {
  std::uint32_t expected = kParkerWoken;
  return state_.compare_exchange_strong(expected, kParkerEmpty, std::memory_order_acquire);
}

bool Parker::park(std::optional<Duration> limit) {
  std::uint32_t expected = kParkerEmpty;
  if (state_.compare_exchange_strong(expected, kParkerAsleep, std::memory_order_acquire)) {
    timespec deadline{};
    if (limit) deadline = parkerDeadline(*limit);
    while (state_.load(std::memory_order_acquire) == kParkerAsleep) {
      if (parkerSleep(state_, limit ? &deadline : nullptr)) continue;
      expected = kParkerAsleep;
      if (state_.compare_exchange_strong(expected, kParkerEmpty, std::memory_order_acquire)) {
        return false;
      }
    }
  }
  state_.store(kParkerEmpty, std::memory_order_relaxed);
  return true;
}

void Parker::unpark() {
  // After the exchange the address is only a number to the kernel: a sleeper that is gone already
  // is none of its.
  if (state_.exchange(kParkerWoken, std::memory_order_acq_rel) == kParkerAsleep) {
    ::syscall(SYS_futex, &state_, FUTEX_WAKE_PRIVATE, 1, nullptr, nullptr, 0);
  }
}

}  // namespace zelkord
