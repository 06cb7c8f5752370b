#pragma once

#include "platform/api/Clock.h"

namespace zelkord {

// The system's clocks: CLOCK_BOOTTIME for steady time, CLOCK_REALTIME for wall time. With a rate
// other than 1 both follow the real time at construction plus rate times what elapsed since, and
// jumps of the wall clock go unnoticed.
//
// Threading: any thread.
class LinuxClock final : public Clock {
 public:
  // Requires 1 <= rate <= 100000.
  explicit LinuxClock(double rate = 1);

  SteadyTime now() const override;
  WallTime wallNow() const override;
  SteadyTime realNow() const override;

  double rate() const { return rate_; }

 private:
  Duration _scaledElapsed() const;

  const double rate_;
  const SteadyTime start_;
  const WallTime wallStart_;
};

// How long a delay of scaled time lasts in real time.
Duration realDuration(Duration scaled, double rate);

}  // namespace zelkord
