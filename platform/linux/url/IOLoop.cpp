#include "platform/linux/url/IOLoop.h"

#include <pthread.h>
#include <sys/epoll.h>
#include <sys/timerfd.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <csignal>
#include <ctime>
#include <utility>

#include "base/Check.h"

namespace zelkord {

IOLoop::IOLoop()
    : inbox_(static_cast<LoopHost&>(*this)),
      epoll_(epoll_create1(EPOLL_CLOEXEC)),
      alarm_(timerfd_create(CLOCK_BOOTTIME, TFD_CLOEXEC | TFD_NONBLOCK)) {
  ZK_CHECK(epoll_ >= 0 && alarm_ >= 0, "an I/O loop has its descriptors");
  for (const int descriptor : {inbox_.descriptor(), alarm_}) {
    epoll_event event{};
    event.events = EPOLLIN | EPOLLET;  // every change is an edge, so nobody needs to read
    event.data.fd = descriptor;
    epoll_ctl(epoll_, EPOLL_CTL_ADD, descriptor, &event);
  }
}

IOLoop::~IOLoop() {
  stop();
  close(alarm_);
  close(epoll_);
}

SteadyTime IOLoop::now() {
  timespec time{};
  clock_gettime(CLOCK_BOOTTIME, &time);
  return SteadyTime(std::chrono::seconds(time.tv_sec) + std::chrono::nanoseconds(time.tv_nsec));
}

void IOLoop::assertCurrent() const {
  ZK_CHECK(inbox_.isCurrent() || !_isRunning(), "the I/O loop is the thread's");
}

bool IOLoop::post(Task task) { return _start() && inbox_.post(std::move(task)); }

// False once the loop is stopped.
bool IOLoop::_start() {
  const MutexLock lock(mutex_);
  if (state_ == State::NotStarted) {
    state_ = State::Running;
    thread_ = std::thread([this] { _run(); });
  }
  return state_ == State::Running;
}

bool IOLoop::_isStarted() const {
  const MutexLock lock(mutex_);
  return state_ != State::NotStarted;
}

bool IOLoop::_isRunning() const {
  const MutexLock lock(mutex_);
  return state_ == State::Running || state_ == State::Stopping;
}

void IOLoop::sync(FunctionRef<void()> task) {
  if (inbox_.isCurrent() || !_isStarted()) return task();
  bool done = false;
  const bool posted = post([&] {
    task();
    const MutexLock lock(mutex_);
    done = true;
    changed_.notifyAll();
  });
  {
    const MutexLock lock(mutex_);
    while (posted ? !done : state_ != State::Stopped) changed_.wait(mutex_);
  }
  if (!posted) task();
}

void IOLoop::stop() {
  ZK_CHECK(!inbox_.isCurrent(), "an I/O loop is stopped from outside");
  std::thread thread;
  {
    const MutexLock lock(mutex_);
    if (state_ == State::NotStarted) state_ = State::Stopped;
    if (state_ == State::Running) state_ = State::Stopping;
    thread = std::move(thread_);
  }
  if (!thread.joinable()) return;
  inbox_.post([] {});  // the thread looks up
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
  inbox_.begin();
  assertCurrent();
  while (true) {
    runPosted(inbox_.take());
    if (needsOwnThread()) break;
    _waitAndDispatch();
  }
  _end();
}

void IOLoop::runPosted(std::vector<Task> tasks) {
  assertCurrent();
  for (Task& task : tasks) std::exchange(task, nullptr)();
  _runDue();
  _setAlarm();
}

bool IOLoop::needsOwnThread() {
  const MutexLock lock(mutex_);
  return state_ != State::Running;
}

void IOLoop::_runDue() {
  const SteadyTime time = now();
  for (std::size_t i = 0; i < clients_.size(); ++i) {
    if (clients_[i]->nextDue() <= time) clients_[i]->runDue(time);
  }
}

void IOLoop::_setAlarm() {
  SteadyTime due = IOLoopClient::kNever;
  for (const IOLoopClient* client : clients_) due = std::min(due, client->nextDue());
  if (due == alarmTime_ || (due > alarmTime_ && due != IOLoopClient::kNever)) return;
  alarmTime_ = due;
  itimerspec setting{};  // zero: off
  if (due != IOLoopClient::kNever) {
    const Duration sinceBoot = std::max(Duration(1), due.time_since_epoch());
    const auto seconds = std::chrono::floor<std::chrono::seconds>(sinceBoot);
    setting.it_value.tv_sec = seconds.count();
    setting.it_value.tv_nsec = (sinceBoot - seconds).count();
  }
  timerfd_settime(alarm_, TFD_TIMER_ABSTIME, &setting, nullptr);
}

void IOLoop::_waitAndDispatch() {
  const bool sleeps = inbox_.beginSleep();
  std::array<epoll_event, 64> events;
  const int count =
      epoll_wait(epoll_, events.data(), static_cast<int>(events.size()), sleeps ? -1 : 0);
  if (sleeps) inbox_.endSleep();
  for (int i = 0; i < count; ++i) {
    const epoll_event& event = events[static_cast<std::size_t>(i)];
    if (event.data.fd == alarm_) alarmTime_ = IOLoopClient::kNever;
    const auto place = static_cast<std::size_t>(event.data.fd);
    IOLoopClient* client = place < watchers_.size() ? watchers_[place] : nullptr;
    if (client) client->ready(event.data.fd, event.events);
  }
}

void IOLoop::_end() {
  runPosted(inbox_.close());
  while (!clients_.empty()) {
    IOLoopClient& client = *clients_.back();
    remove(client);
    client.loopEnded();
  }
  inbox_.end();
  const MutexLock lock(mutex_);
  state_ = State::Stopped;
  changed_.notifyAll();
}

}  // namespace zelkord
