#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <thread>
#include <utility>
#include <vector>

#include "base/Mutex.h"
#include "base/Time.h"
#include "platform/api/WorkQueue.h"
#include "platform/linux/loop/SteadyTimer.h"

namespace zelkord {

class Alarm;
class QueueCore;

// All delayed tasks and timers of the process: one thread that sleeps on one timerfd
// (CLOCK_BOOTTIME) until the next alarm, and then hands tasks to their queues. No alarm, no
// wake-up.
//
// An alarm may fire within its leeway, so that a wake-up serves all alarms whose time has come by
// then. Arming an armed alarm for later only writes the new time down: its old place is looked at
// when it comes up, and moved.
//
// Threading: any thread. Ownership: shared; subscriptions hold it weakly.
class TimerService final {
 public:
  TimerService() = default;
  ~TimerService();
  TimerService(const TimerService&) = delete;
  TimerService& operator=(const TimerService&) = delete;

  // `delay` is real time.
  void arm(const std::shared_ptr<Alarm>& alarm, Duration delay, Duration leeway);
  void disarm(Alarm& alarm);
  // The alarm never fires again and lets its task go.
  void remove(Alarm& alarm);
  // Removes the alarms of a queue that is no more.
  void removeAllOf(const QueueCore& core);
  // Ends the thread. Nothing fires after it.
  void stop();

 private:
  // When it must have fired at the latest, then the order of arming.
  using Key = std::pair<SteadyTime, std::uint64_t>;
  using Alarms = std::map<Key, std::shared_ptr<Alarm>>;
  struct Due {
    SteadyTime deadline;
    std::uint64_t sequence;
    std::uint64_t generation;
    std::shared_ptr<Alarm> alarm;
  };

  void _run();
  std::vector<Due> _takeDue(SteadyTime now);
  void _place(const std::shared_ptr<Alarm>& alarm) ZK_REQUIRES(mutex_);
  std::shared_ptr<Alarm> _unplace(Alarm& alarm) ZK_REQUIRES(mutex_);
  void _program() ZK_REQUIRES(mutex_);

  SteadyTimer timer_{SteadyTimer::Reads::Wait};

  Mutex mutex_;
  Alarms alarms_ ZK_GUARDED_BY(mutex_);
  std::uint64_t nextSequence_ ZK_GUARDED_BY(mutex_) = 0;
  Duration longestLeeway_ ZK_GUARDED_BY(mutex_){0};
  SteadyTime programmed_ ZK_GUARDED_BY(mutex_) = SteadyTime::max();
  bool stopped_ ZK_GUARDED_BY(mutex_) = false;
  std::thread thread_ ZK_GUARDED_BY(mutex_);  // runs from the first alarm on
};

}  // namespace zelkord
