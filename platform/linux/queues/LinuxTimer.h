#pragma once

#include <memory>
#include <utility>

#include "platform/api/WorkQueues.h"
#include "platform/linux/queues/Alarm.h"
#include "platform/linux/queues/LinuxClock.h"
#include "platform/linux/queues/TimerService.h"

namespace zelkord {

// An alarm that is armed again and again; `rate` is the clock's.
class LinuxTimer final : public Timer {
 public:
  LinuxTimer(std::shared_ptr<TimerService> timers, std::shared_ptr<Alarm> alarm, double rate)
      : timers_(std::move(timers)), alarm_(std::move(alarm)), rate_(rate) {}
  ~LinuxTimer() override { timers_->remove(*alarm_); }
  LinuxTimer(const LinuxTimer&) = delete;
  LinuxTimer& operator=(const LinuxTimer&) = delete;

  void arm(Duration delay, Duration leeway) override {
    timers_->arm(alarm_, realDuration(delay, rate_), realDuration(leeway, rate_));
  }
  void cancel() override { timers_->disarm(*alarm_); }

 private:
  const std::shared_ptr<TimerService> timers_;
  const std::shared_ptr<Alarm> alarm_;
  const double rate_;
};

}  // namespace zelkord
