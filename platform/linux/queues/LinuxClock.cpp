#include "platform/linux/queues/LinuxClock.h"

#include <time.h>

#include "base/Check.h"
#include "platform/linux/loop/SteadyTimer.h"

namespace zelkord {

namespace {

WallTime readWallClock() {
  timespec time{};
  ::clock_gettime(CLOCK_REALTIME, &time);
  return WallTime(std::chrono::seconds(time.tv_sec) + std::chrono::nanoseconds(time.tv_nsec));
}

}  // namespace

LinuxClock::LinuxClock(double rate)
    : rate_(rate), start_(steadyNow()), wallStart_(readWallClock()) {
  ZK_CHECK(rate >= 1 && rate <= 100'000, "clock rate out of range");
}

SteadyTime LinuxClock::realNow() const { return steadyNow(); }

Duration LinuxClock::_scaledElapsed() const {
  return durationOfSeconds(secondsOf(realNow() - start_) * rate_);
}

SteadyTime LinuxClock::now() const {
  return rate_ == 1 ? realNow() : deadlineAfter(start_, _scaledElapsed());
}

WallTime LinuxClock::wallNow() const {
  return rate_ == 1 ? readWallClock() : wallStart_ + _scaledElapsed();
}

Duration realDuration(Duration scaled, double rate) {
  return rate == 1 ? scaled : durationOfSeconds(secondsOf(scaled) / rate);
}

}  // namespace zelkord
