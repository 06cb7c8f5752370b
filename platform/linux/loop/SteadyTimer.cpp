#include "platform/linux/loop/SteadyTimer.h"

#include <sys/timerfd.h>
#include <time.h>

#include <algorithm>

#include "base/Check.h"

namespace zelkord {

SteadyTime steadyNow() {
  timespec time{};
  ::clock_gettime(CLOCK_BOOTTIME, &time);
  return SteadyTime(std::chrono::seconds(time.tv_sec) + std::chrono::nanoseconds(time.tv_nsec));
}

SteadyTimer::SteadyTimer(Reads reads)
    : descriptor_(::timerfd_create(CLOCK_BOOTTIME,
                                   TFD_CLOEXEC | (reads == Reads::Wait ? 0 : TFD_NONBLOCK))) {
  ZK_CHECK(descriptor_, "no timer from the kernel");
}

void SteadyTimer::set(SteadyTime time) {
  itimerspec setting{};  // zero: off
  if (time != kNever) {
    const Duration sinceBoot = std::max(Duration(1), time.time_since_epoch());
    const auto seconds = std::chrono::floor<std::chrono::seconds>(sinceBoot);
    setting.it_value.tv_sec = seconds.count();
    setting.it_value.tv_nsec = (sinceBoot - seconds).count();
  }
  ::timerfd_settime(descriptor_.get(), TFD_TIMER_ABSTIME, &setting, nullptr);
}

}  // namespace zelkord
