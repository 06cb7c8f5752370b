#include "platform/linux/queues/TimerService.h"

#include <unistd.h>

#include <algorithm>
#include <tuple>

#include "platform/linux/queues/Alarm.h"
#include "platform/linux/system/ServiceThread.h"

namespace zelkord {

TimerService::~TimerService() { stop(); }

void TimerService::arm(const std::shared_ptr<Alarm>& alarm, Duration delay, Duration leeway) {
  const SteadyTime deadline = deadlineAfter(steadyNow(), delay);
  std::shared_ptr<Alarm> released;
  const MutexLock lock(mutex_);
  if (stopped_) return;
  alarm->armed_ = true;
  alarm->armedGeneration_ = alarm->beginGeneration();
  alarm->deadline_ = deadline;
  alarm->leeway_ = std::max(Duration::zero(), leeway);
  longestLeeway_ = std::max(longestLeeway_, alarm->leeway_);
  if (alarm->place_ && alarm->place_->first <= deadlineAfter(deadline, leeway)) return;
  released = _unplace(*alarm);
  _place(alarm);
  _program();
  if (!thread_.joinable())
    thread_ = startServiceThread("zk-timer", ThreadWork::Tasks, [this] { _run(); });
}

void TimerService::disarm(Alarm& alarm) {
  alarm.beginGeneration();
  const MutexLock lock(mutex_);
  alarm.armed_ = false;
}

void TimerService::remove(Alarm& alarm) {
  const auto task = alarm.retire();
  std::shared_ptr<Alarm> released;
  const MutexLock lock(mutex_);
  alarm.armed_ = false;
  released = _unplace(alarm);
}

void TimerService::removeAllOf(const QueueCore& core) {
  std::vector<std::shared_ptr<const Task>> tasks;
  std::vector<std::shared_ptr<Alarm>> released;
  const MutexLock lock(mutex_);
  for (auto i = alarms_.begin(); i != alarms_.end();) {
    if (!i->second->isFor(core)) {
      ++i;
      continue;
    }
    tasks.push_back(i->second->retire());
    i->second->place_.reset();
    released.push_back(std::move(i->second));
    i = alarms_.erase(i);
  }
}

void TimerService::_place(const std::shared_ptr<Alarm>& alarm) {
  const Key key{deadlineAfter(alarm->deadline_, alarm->leeway_), nextSequence_++};
  alarm->place_ = key;
  alarms_.emplace(key, alarm);
}

// The alarm as it was kept there, for the caller to release after the lock.
std::shared_ptr<Alarm> TimerService::_unplace(Alarm& alarm) {
  if (!alarm.place_) return nullptr;
  const auto node = alarms_.extract(*alarm.place_);
  alarm.place_.reset();
  return node ? node.mapped() : nullptr;
}

void TimerService::_program() {
  const SteadyTime first = alarms_.empty() ? SteadyTime::max() : alarms_.begin()->first.first;
  if (first >= programmed_) return;
  programmed_ = first;
  timer_.set(first);
}

void TimerService::_run() {
  for (;;) {
    std::uint64_t expirations = 0;
    if (::read(timer_.descriptor(), &expirations, sizeof expirations) < 0) continue;
    {
      const MutexLock lock(mutex_);
      if (stopped_) return;
    }
    for (const Due& due : _takeDue(steadyNow())) Alarm::fire(due.alarm, due.generation);
  }
}

// Takes out what is due, in the order of deadlines, and sets the timer for the rest.
std::vector<TimerService::Due> TimerService::_takeDue(SteadyTime now) {
  std::vector<Due> due;
  std::vector<std::shared_ptr<Alarm>> moved;
  const MutexLock lock(mutex_);
  const SteadyTime horizon = deadlineAfter(now, longestLeeway_);
  for (auto i = alarms_.begin(); i != alarms_.end() && i->first.first <= horizon;) {
    const auto& alarm = i->second;
    const bool isDue = alarm->armed_ && alarm->deadline_ <= now;
    if (!isDue && i->first.first > now) {
      ++i;
      continue;
    }
    alarm->place_.reset();
    if (isDue) {
      alarm->armed_ = false;
      due.push_back({alarm->deadline_, i->first.second, alarm->armedGeneration_, alarm});
    } else {
      moved.push_back(alarm);  // armed for later since it took this place, or not armed any more
    }
    i = alarms_.erase(i);
  }
  for (const auto& alarm : moved) {
    if (alarm->armed_) _place(alarm);
  }
  programmed_ = SteadyTime::max();
  _program();
  std::sort(due.begin(), due.end(), [](const Due& a, const Due& b) {
    return std::tie(a.deadline, a.sequence) < std::tie(b.deadline, b.sequence);
  });
  return due;
}

void TimerService::stop() {
  std::thread thread;
  Alarms released;
  {
    const MutexLock lock(mutex_);
    stopped_ = true;
    thread = std::move(thread_);
    released.swap(alarms_);
    for (const auto& [key, alarm] : released) alarm->place_.reset();
    timer_.set(SteadyTime{});
  }
  if (thread.joinable()) thread.join();
}

}  // namespace zelkord
