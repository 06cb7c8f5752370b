#include "platform/linux/loop/Loop.h"

#include <utility>

#include "base/Check.h"
#include "platform/linux/system/ServiceThread.h"

namespace zelkord {

Loop::Loop(const char* name, LoopCrew* crew)
    : name_(name),
      inbox_(std::make_shared<LoopInbox>(static_cast<LoopHost&>(*this))),
      crew_(crew),
      helm_(crew ? std::make_shared<LoopHelm>(*crew, static_cast<LedLoop&>(*this),
                                              watches_.descriptor())
                 : nullptr) {
  watches_.addWaker(inbox_->descriptor());
  watches_.addWaker(timers_.descriptor());
}

Loop::~Loop() { stop(); }

void Loop::assertCurrent() const {
  ZK_CHECK(isCurrent() || !_isRunning(), "the loop belongs to another thread");
}

bool Loop::post(Task task, LoopInbox::Runner runner) {
  return _start() && inbox_->post(std::move(task), runner);
}

// False once the loop is stopped.
bool Loop::_start() {
  const MutexLock lock(mutex_);
  if (state_ == State::NotStarted) {
    if (crew_) {
      crew_->begin(helm_);
    } else {
      thread_ = startServiceThread(name_, ThreadWork::Loop, [this] { lead(); });
    }
    state_ = State::Running;
  }
  return state_ == State::Running;
}

bool Loop::_isRunning() const {
  const MutexLock lock(mutex_);
  return state_ == State::Running || state_ == State::Stopping;
}

void Loop::sync(FunctionRef<void()> task) {
  if (isCurrent()) return task();
  bool done = false;
  const bool posted = post([&] {
    task();
    const MutexLock lock(mutex_);
    done = true;
    changed_.notifyAll();
  });
  {
    const MutexLock lock(mutex_);
    while (posted ? !done : state_ != State::Ended) changed_.wait(mutex_);
  }
  if (!posted) task();
}

void Loop::stop() {
  ZK_CHECK(!isCurrent(), "a loop is stopped from outside");
  std::vector<Task> dropped;
  std::thread thread;
  {
    const MutexLock lock(mutex_);
    if (state_ == State::NotStarted) dropped = inbox_->close();
    if (state_ == State::NotStarted) state_ = State::Ended;
    if (state_ != State::Running) return;
    state_ = State::Stopping;
    thread = std::move(thread_);
  }
  inbox_->post([this] {
    assertCurrent();
    stopping_ = true;
  });
  if (thread.joinable()) return thread.join();
  const MutexLock lock(mutex_);
  while (state_ != State::Ended) changed_.wait(mutex_);
}

Subscription Loop::watch(int descriptor, std::uint32_t events, LoopWatches::Ready ready) {
  assertCurrent();
  const auto serial = watches_.add(descriptor, events, std::move(ready));
  return Subscription([this, descriptor, serial] {
    assertCurrent();
    watches_.remove(descriptor, serial);
  });
}

void Loop::changeEvents(int descriptor, std::uint32_t events) {
  assertCurrent();
  watches_.change(descriptor, events);
}

Subscription Loop::after(Duration delay, Task task) {
  assertCurrent();
  const auto due = deadlineAfter(steadyNow(), delay);
  const auto place = timers_.place(due, std::make_shared<const Task>(std::move(task)));
  return Subscription([this, place] { timers().cancel(place); });
}

LoopTimers& Loop::timers() {
  assertCurrent();
  return timers_;
}

void Loop::soon(Task task) {
  assertCurrent();
  soon_.push_back(std::move(task));
}

void Loop::inSpareTime(Task task) {
  assertCurrent();
  inSpareTime_.push_back(std::move(task));
}

Subscription Loop::atEnd(Task task) {
  assertCurrent();
  const auto id = ++lastEnding_;
  endings_.emplace(id, std::move(task));
  return Subscription([this, id] {
    assertCurrent();
    endings_.erase(id);
  });
}

LedLoop::Left Loop::lead() {
  inbox_->endSleep();
  assertCurrent();
  WorkCarrier carrier(helm_);
  while (!stopping_) {
    _wait();
    // What was read first does not wait for the rest.
    watches_.dispatch([&carrier] { carrier.passOn(); });
    _work(inbox_->take());
    if (!inSpareTime_.empty()) carrier.passOn();
    _runInSpareTime();
    if (carrier.isLoaded() && !_carry(carrier)) return Left::TakenOver;
  }
  carrier.close();
  _end();
  return Left::Ended;
}

// False when somebody else leads the loop now: then nothing of it may be touched.
bool Loop::_carry(WorkCarrier& carrier) {
  if (!_goesAway()) {
    carrier.passOn();
    return true;
  }
  if (!carrier.carry()) return false;
  inbox_->endSleep();
  return true;
}

// Whether all is done that only the leader can do, so that the loop is asleep now.
bool Loop::_goesAway() {
  _work(inbox_->take());
  timers_.setAlarm();
  return !stopping_ && soon_.empty() && inSpareTime_.empty() && inbox_->beginSleep();
}

// Waits for events, or only looks for them when there is something else to do.
void Loop::_wait() {
  timers_.setAlarm();
  const bool sleeps = soon_.empty() && inSpareTime_.empty() && inbox_->beginSleep();
  watches_.wait(sleeps ? LoopWatches::Wait::Yes : LoopWatches::Wait::No);
  if (sleeps) inbox_->endSleep();
}

void Loop::_work(std::vector<Task> tasks) {
  _runAll(std::move(tasks));
  timers_.runDue();
  _runAll(std::exchange(soon_, {}));
}

void Loop::runPosted(std::vector<Task> tasks) {
  assertCurrent();
  _work(std::move(tasks));
  timers_.setAlarm();
}

bool Loop::needsOwnThread() {
  assertCurrent();
  return stopping_ || !soon_.empty() || !inSpareTime_.empty();
}

void Loop::_runInSpareTime() {
  if (inSpareTime_.empty()) return;
  const auto end = steadyNow() + kSpareTime;
  do {
    const auto task = std::move(inSpareTime_.front());
    inSpareTime_.pop_front();
    task();
  } while (!inSpareTime_.empty() && steadyNow() < end);
}

void Loop::_end() {
  if (helm_) helm_->end();
  _work(inbox_->close());
  while (!endings_.empty()) {
    const auto last = endings_.extract(std::prev(endings_.end()));
    last.mapped()();
  }
  timers_.clear();
  watches_.clear();
  // What they hold may ask for more when it goes.
  while (!soon_.empty() || !inSpareTime_.empty()) {
    const auto dropped = std::exchange(soon_, {});
    const auto droppedInSpareTime = std::exchange(inSpareTime_, {});
  }
  inbox_->end();
  const MutexLock lock(mutex_);
  state_ = State::Ended;
  changed_.notifyAll();
}

void Loop::_runAll(std::vector<Task> tasks) {
  for (auto& task : tasks) std::exchange(task, nullptr)();
}

}  // namespace zelkord
