#include "platform/linux/ipc/EventLoop.h"

#include <pthread.h>
#include <signal.h>
#include <sys/epoll.h>

#include <algorithm>
#include <array>
#include <future>
#include <limits>
#include <utility>

#include "base/Check.h"

namespace zelkord::ipc {
namespace {

constexpr int kEventsAtOnce = 64;

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

EventLoop::EventLoop() : epoll_(::epoll_create1(EPOLL_CLOEXEC)) {
  ZK_CHECK(epoll_, "no epoll for the IPC thread");
  epoll_event event{.events = EPOLLIN, .data = {.u64 = 0}};
  ::epoll_ctl(epoll_.get(), EPOLL_CTL_ADD, inbox_->descriptor(), &event);
  // The thread waits for `thread_` to be assigned before it looks at itself.
  std::promise<void> assigned;
  thread_ = makeQuietThread([this, ready = assigned.get_future().share()] {
    ready.wait();
    pthread_setname_np(pthread_self(), "zelkord-ipc");
    _run();
  });
  assigned.set_value();
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

void EventLoop::_run() {
  std::array<epoll_event, kEventsAtOnce> events;
  while (!stopping_) {
    const int count =
        ::epoll_wait(epoll_.get(), events.data(), kEventsAtOnce, _millisecondsToWait());
    for (int i = 0; i < count; ++i) {
      const auto id = events[i].data.u64;
      if (id == 0) {
        _runAll(inbox_->take());
      } else if (const auto found = watched_.find(id); found != watched_.end()) {
        const auto watched = found->second;  // may be unwatched by its own call
        watched->ready(events[i].events);
      }
    }
    _runDueTimers();
    _runAll(std::exchange(soon_, {}));
  }
  inbox_->close();
  timers_.clear();
  watched_.clear();
  soon_.clear();
}

int EventLoop::_millisecondsToWait() const {
  if (!soon_.empty()) return 0;
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
