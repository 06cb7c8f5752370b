#pragma once

#include <chrono>

#include "base/Namespace.h"

namespace zelkor {

using Duration = std::chrono::nanoseconds;
using namespace std::chrono_literals;

// Time since boot, suspend included: for waiting and for ages.
struct SteadyClock {
  using duration = Duration;
  using rep = duration::rep;
  using period = duration::period;
  using time_point = std::chrono::time_point<SteadyClock>;
  static constexpr bool is_steady = true;
};
using SteadyTime = SteadyClock::time_point;

// Civil time: for stamps only; it may jump.
using WallTime = std::chrono::time_point<std::chrono::system_clock, Duration>;

inline double secondsOf(Duration duration) {
  return std::chrono::duration<double>(duration).count();
}
inline double secondsSince1970(WallTime time) { return secondsOf(time.time_since_epoch()); }
inline constexpr double kMaximumSeconds = 9.2e9;  // what a Duration holds

// The moment `delay` from `now`: a negative delay counts as none, what lies beyond the clock's
// range as its end.
inline SteadyTime deadlineAfter(SteadyTime now, Duration delay) {
  if (delay <= Duration::zero()) return now;
  return delay > SteadyTime::max() - now ? SteadyTime::max() : now + delay;
}

// Seconds as a Duration; clamped to ±kMaximumSeconds, not-a-number is zero.
inline Duration durationOfSeconds(double seconds) {
  if (!(seconds == seconds)) return {};
  const double clamped = seconds > kMaximumSeconds    ? kMaximumSeconds
                         : seconds < -kMaximumSeconds ? -kMaximumSeconds
                                                      : seconds;
  return std::chrono::duration_cast<Duration>(std::chrono::duration<double>(clamped));
}
inline WallTime wallTimeOfSeconds(double seconds) { return WallTime(durationOfSeconds(seconds)); }

}  // namespace zelkor
