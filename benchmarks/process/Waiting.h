#pragma once

#include <chrono>
#include <stdexcept>
#include <string>
#include <thread>

namespace zelkord::bench {

using Clock = std::chrono::steady_clock;

inline double microsecondsSince(Clock::time_point start) {
  return std::chrono::duration<double, std::micro>(Clock::now() - start).count();
}

// Looks every 2 ms until `condition` holds; throws std::runtime_error after `limit`.
template <typename Condition>
void waitFor(const std::string& what, std::chrono::seconds limit, const Condition& condition) {
  const auto deadline = Clock::now() + limit;
  while (!condition()) {
    if (Clock::now() > deadline) throw std::runtime_error("waited in vain for " + what);
    std::this_thread::sleep_for(std::chrono::milliseconds(2));
  }
}

}  // namespace zelkord::bench
