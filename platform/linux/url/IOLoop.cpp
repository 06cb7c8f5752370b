#include "platform/linux/url/IOLoop.h"

#include <pthread.h>
#include <sys/epoll.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <csignal>
#include <ctime>
#include <utility>

#include "base/Check.h"

namespace zelkord {

IOLoop::IOLoop()
    : epoll_(epoll_create1(EPOLL_CLOEXEC)), wakeUp_(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {
  ZK_CHECK(epoll_ >= 0 && wakeUp_ >= 0, "an I/O loop has its descriptors");
  epoll_event event{};
  event.events = EPOLLIN | EPOLLET;  // every write is an edge, so nobody needs to read
  event.data.fd = wakeUp_;
  epoll_ctl(epoll_, EPOLL_CTL_ADD, wakeUp_, &event);
}

IOLoop::~IOLoop() {
  stop();
  close(wakeUp_);
  close(epoll_);
}

SteadyTime IOLoop::now() {
  timespec time{};
  clock_gettime(CLOCK_BOOTTIME, &time);
  return SteadyTime(std::chrono::seconds(time.tv_sec) + std::chrono::nanoseconds(time.tv_nsec));
}

void IOLoop::assertCurrent() const {
  ZK_CHECK(_isOwnThread() || owner_.load() == std::thread::id(), "on the I/O loop's thread");
}

bool IOLoop::post(Task task) {
  bool wakes = false;
  {
    const MutexLock lock(mutex_);
    if (state_ == State::Stopping || state_ == State::Stopped) return false;
    posted_.push_back(std::move(task));
    if (state_ == State::NotStarted) {
      state_ = State::Running;
      thread_ = std::thread([this] { _run(); });
    }
    wakes = std::exchange(asleep_, false);
  }
  if (wakes) eventfd_write(wakeUp_, 1);
  return true;
}

bool IOLoop::_isStarted() const {
  const MutexLock lock(mutex_);
  return state_ != State::NotStarted;
}

void IOLoop::sync(FunctionRef<void()> task) {
  if (_isOwnThread() || !_isStarted()) return task();
  bool done = false;
  const bool posted = post([&] {
    task();
    const MutexLock lock(mutex_);
    done = true;
    changed_.notify_all();
  });
  {
    const MutexLock lock(mutex_);
    while (posted ? !done : state_ != State::Stopped) changed_.wait(mutex_);
  }
  if (!posted) task();
}

void IOLoop::stop() {
  ZK_CHECK(!_isOwnThread(), "an I/O loop is stopped from outside");
  std::thread thread;
  {
    const MutexLock lock(mutex_);
    if (state_ == State::NotStarted) state_ = State::Stopped;
    if (state_ == State::Running) state_ = State::Stopping;
    thread = std::move(thread_);
  }
  if (!thread.joinable()) return;
  eventfd_write(wakeUp_, 1);
  thread.join();
}

void IOLoop::add(IOLoopClient& client) { clients_.push_back(&client); }

void IOLoop::remove(IOLoopClient& client) {
  std::erase(clients_, &client);
  unwatchAll(client);
}

void IOLoop::watch(int descriptor, std::uint32_t events, IOLoopClient& client) {
  const auto place = static_cast<std::size_t>(descriptor);
  if (watchers_.size() <= place) watchers_.resize(place + 1);
  // A descriptor may have been closed, and with it forgotten by epoll, without being unwatched.
  const bool known = std::exchange(watchers_[place], &client) != nullptr;
  const int first = known ? EPOLL_CTL_MOD : EPOLL_CTL_ADD;
  epoll_event event{};
  event.events = events;
  event.data.fd = descriptor;
  if (epoll_ctl(epoll_, first, descriptor, &event) == 0) return;
  epoll_ctl(epoll_, known ? EPOLL_CTL_ADD : EPOLL_CTL_MOD, descriptor, &event);
}

void IOLoop::unwatch(int descriptor) {
  const auto place = static_cast<std::size_t>(descriptor);
  if (place >= watchers_.size() || !std::exchange(watchers_[place], nullptr)) return;
  epoll_ctl(epoll_, EPOLL_CTL_DEL, descriptor, nullptr);
}

void IOLoop::unwatchAll(const IOLoopClient& client) {
  for (std::size_t descriptor = 0; descriptor < watchers_.size(); ++descriptor) {
    if (watchers_[descriptor] == &client) unwatch(static_cast<int>(descriptor));
  }
}

void IOLoop::_run() {
  sigset_t all;
  sigfillset(&all);
  pthread_sigmask(SIG_BLOCK, &all, nullptr);
  pthread_setname_np(pthread_self(), "zelkord-url");
  owner_ = std::this_thread::get_id();
  assertCurrent();
  while (_runPosted()) {
    _runDue();
    _waitAndDispatch();
  }
  _end();
}

// False when the loop is stopping and nothing more is posted.
bool IOLoop::_runPosted() {
  while (true) {
    {
      const MutexLock lock(mutex_);
      if (posted_.empty()) return state_ == State::Running;
      running_.swap(posted_);
    }
    for (Task& task : running_) std::exchange(task, nullptr)();
    running_.clear();
  }
}

void IOLoop::_runDue() {
  const SteadyTime time = now();
  for (std::size_t i = 0; i < clients_.size(); ++i) {
    if (clients_[i]->nextDue() <= time) clients_[i]->runDue(time);
  }
}

int IOLoop::_waitMilliseconds() const {
  SteadyTime due = IOLoopClient::kNever;
  for (const IOLoopClient* client : clients_) due = std::min(due, client->nextDue());
  if (due == IOLoopClient::kNever) return -1;
  const auto wait = std::chrono::ceil<std::chrono::milliseconds>(due - now());
  return static_cast<int>(std::clamp<std::int64_t>(wait.count(), 0, 3'600'000));
}

void IOLoop::_waitAndDispatch() {
  int wait = _waitMilliseconds();
  {
    const MutexLock lock(mutex_);
    asleep_ = posted_.empty() && state_ == State::Running;
    if (!asleep_) wait = 0;
  }
  std::array<epoll_event, 64> events;
  const int count = epoll_wait(epoll_, events.data(), static_cast<int>(events.size()), wait);
  {
    const MutexLock lock(mutex_);
    asleep_ = false;
  }
  for (int i = 0; i < count; ++i) {
    const epoll_event& event = events[static_cast<std::size_t>(i)];
    const auto place = static_cast<std::size_t>(event.data.fd);
    IOLoopClient* client = place < watchers_.size() ? watchers_[place] : nullptr;
    if (client) client->ready(event.data.fd, event.events);
  }
}

void IOLoop::_end() {
  while (!clients_.empty()) {
    IOLoopClient& client = *clients_.back();
    remove(client);
    client.loopEnded();
  }
  const MutexLock lock(mutex_);
  owner_ = std::thread::id();
  state_ = State::Stopped;
  changed_.notify_all();
}

}  // namespace zelkord
