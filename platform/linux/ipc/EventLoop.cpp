#include "platform/linux/ipc/EventLoop.h"

#include <pthread.h>
#include <signal.h>

#include <algorithm>
#include <array>
#include <future>
#include <limits>
#include <utility>

#include "base/Check.h"

namespace zelkord::ipc {
namespace {

// A thread that no signal is delivered to.
template <typename Function>
std::thread makeQuietThread(Function function) {
  sigset_t all;
  sigset_t before;
  sigfillset(&all);
  pthread_sigmask(SIG_SETMASK, &all, &before);
  std::thread thread(std::move(function));
  pthread_sigmask(SIG_SETMASK, &before, nullptr);
  return thread;
}

}  // namespace

EventLoop::EventLoop()
    : epoll_(::epoll_create1(EPOLL_CLOEXEC)),
      inbox_(std::make_shared<LoopInbox>(static_cast<LoopHost&>(*this))) {
  ZK_CHECK(epoll_, "no epoll for the IPC thread");
  epoll_event event{.events = EPOLLIN | EPOLLET, .data = {.u64 = 0}};
  ::epoll_ctl(epoll_.get(), EPOLL_CTL_ADD, inbox_->descriptor(), &event);
  thread_ = makeQuietThread([this] {
    pthread_setname_np(pthread_self(), "zelkord-ipc");
    _run();
  });
}

EventLoop::~EventLoop() { stop(); }

void EventLoop::stop() {
  if (!thread_.joinable()) return;
  inbox_->post([this] { stopping_ = true; });
  thread_.join();
}

bool EventLoop::sync(FunctionRef<void()> task) {
  if (isCurrent()) {
    task();
    return true;
  }
  // A dropped task breaks the promise, which ends the wait as well.
  auto done = std::make_shared<std::promise<void>>();
  auto waiting = done->get_future();
  auto ran = std::make_shared<bool>(false);
  inbox_->post([task, ran, done = std::move(done)] {
    task();
    *ran = true;
    done->set_value();
  });
  waiting.wait();
  return *ran;
}

void EventLoop::assertCurrent() const { ZK_CHECK(isCurrent(), "not on the IPC thread"); }

Subscription EventLoop::watch(int fd, std::uint32_t events, Ready ready) {
  const auto id = ++lastId_;
  watched_[id] = std::make_shared<Watched>(Watched{fd, std::move(ready)});
  idOfDescriptor_[fd] = id;
  epoll_event event{.events = events, .data = {.u64 = id}};
  ::epoll_ctl(epoll_.get(), EPOLL_CTL_ADD, fd, &event);
  return Subscription([this, id, fd] {
    ::epoll_ctl(epoll_.get(), EPOLL_CTL_DEL, fd, nullptr);
    idOfDescriptor_.erase(fd);
    watched_.erase(id);
  });
}

void EventLoop::changeEvents(int fd, std::uint32_t events) {
  const auto found = idOfDescriptor_.find(fd);
  if (found == idOfDescriptor_.end()) return;
  epoll_event event{.events = events, .data = {.u64 = found->second}};
  ::epoll_ctl(epoll_.get(), EPOLL_CTL_MOD, fd, &event);
}

Subscription EventLoop::after(Duration delay, Task task) {
  const auto due = std::chrono::steady_clock::now() +
                   std::chrono::duration_cast<std::chrono::steady_clock::duration>(delay);
  const auto key = std::pair(due, ++lastId_);
  timers_.emplace(key, std::move(task));
  return Subscription([this, key] { timers_.erase(key); });
}

void EventLoop::soon(Task task) { soon_.push_back(std::move(task)); }

void EventLoop::inSpareTime(Task task) { inSpareTime_.push_back(std::move(task)); }

void EventLoop::_run() {
  inbox_->begin();
  std::array<epoll_event, kEventsAtOnce> events;
  while (!stopping_) {
    const int count = _sleep(events);
    for (int i = 0; i < count; ++i) _dispatch(events[static_cast<std::size_t>(i)]);
    _runAll(inbox_->take());
    _runDueTimers();
    _runSoon();
    _runInSpareTime();
  }
  inbox_->close();
  timers_.clear();
  watched_.clear();
  soon_.clear();
  inSpareTime_.clear();
  inbox_->end();
}

// Waits for events, or only looks for them when there is something else to do.
int EventLoop::_sleep(std::array<epoll_event, kEventsAtOnce>& events) {
  const int milliseconds = _millisecondsToWait();
  const bool sleeps = milliseconds != 0 && inbox_->beginSleep();
  const int count =
      ::epoll_wait(epoll_.get(), events.data(), kEventsAtOnce, sleeps ? milliseconds : 0);
  if (sleeps) inbox_->endSleep();
  return count;
}

void EventLoop::_dispatch(const epoll_event& event) {
  const std::uint64_t number = event.data.u64;  // the event is packed: no reference to its member
  const auto found = watched_.find(number);
  if (found == watched_.end()) return;
  const auto watched = found->second;  // may be unwatched by its own call
  watched->ready(event.events);
}

void EventLoop::runPosted(std::vector<Task> tasks) {
  _runAll(std::move(tasks));
  _runSoon();
}

bool EventLoop::needsOwnThread() {
  const bool isDueEarlier = !timers_.empty() && timers_.begin()->first.first < sleepsUntil_;
  return stopping_ || !soon_.empty() || !inSpareTime_.empty() || isDueEarlier;
}

void EventLoop::_runSoon() { _runAll(std::exchange(soon_, {})); }

void EventLoop::_runInSpareTime() {
  if (inSpareTime_.empty()) return;
  const auto end = std::chrono::steady_clock::now() + kSpareTime;
  do {
    const auto task = std::move(inSpareTime_.front());
    inSpareTime_.pop_front();
    task();
  } while (!inSpareTime_.empty() && std::chrono::steady_clock::now() < end);
}

int EventLoop::_millisecondsToWait() {
  sleepsUntil_ = timers_.empty() ? Instant::max() : timers_.begin()->first.first;
  if (!soon_.empty() || !inSpareTime_.empty()) return 0;
  if (timers_.empty()) return -1;
  const auto left = timers_.begin()->first.first - std::chrono::steady_clock::now();
  const auto milliseconds = std::chrono::ceil<std::chrono::milliseconds>(left).count();
  return static_cast<int>(
      std::clamp<std::int64_t>(milliseconds, 0, std::numeric_limits<int>::max()));
}

void EventLoop::_runDueTimers() {
  if (timers_.empty()) return;
  const auto now = std::chrono::steady_clock::now();
  while (!timers_.empty() && timers_.begin()->first.first <= now) {
    const auto task = std::move(timers_.begin()->second);
    timers_.erase(timers_.begin());
    task();
  }
}

void EventLoop::_runAll(std::vector<Task> tasks) {
  for (auto& task : tasks) std::exchange(task, nullptr)();
}

}  // namespace zelkord::ipc
