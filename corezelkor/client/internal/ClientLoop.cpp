#include "corezelkor/client/internal/ClientLoop.h"

#include <pthread.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <algorithm>
#include <cstdint>
#include <utility>

#include "base/Check.h"

namespace zelkor {
namespace {

// Rounded up, so that a wait never ends before its deadline.
int millisecondsUntil(ClientTime deadline) {
  if (deadline == ClientTime::max()) return -1;
  constexpr std::int64_t kLongest = 60'000;
  const auto left =
      std::chrono::ceil<std::chrono::milliseconds>(deadline - std::chrono::steady_clock::now());
  return static_cast<int>(std::clamp<std::int64_t>(left.count(), 0, kLongest));
}

}  // namespace

ClientLoop::ClientLoop(std::function<LoopWait()> turn)
    : turn_(std::move(turn)), wakeUp_(::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {
  ZK_CHECK(wakeUp_ >= 0, "a client needs one event descriptor");
}

void ClientLoop::start() {
  thread_ = std::thread([this] { _run(); });
}

ClientLoop::~ClientLoop() {
  if (thread_.joinable()) finish([] {});
  ::close(wakeUp_);
}

void ClientLoop::post(std::function<void()> task) {
  {
    const MutexLock lock(mutex_);
    tasks_.push_back(std::move(task));
  }
  _wake();
}

void ClientLoop::finish(std::function<void()> last) {
  ZK_CHECK(current_ != std::this_thread::get_id(), "a client cannot end on its own thread");
  post([this, last = std::move(last)] {
    last();
    stopped_ = true;
  });
  thread_.join();
}

void ClientLoop::assertCurrent() const {
  ZK_CHECK(current_ == std::this_thread::get_id(), "only on the client's thread");
}

void ClientLoop::_wake() const {
  const std::uint64_t one = 1;
  [[maybe_unused]] const auto written = ::write(wakeUp_, &one, sizeof one);
}

void ClientLoop::_run() {
  current_ = std::this_thread::get_id();
  ::pthread_setname_np(::pthread_self(), "zelkor-client");
  while (!stopped_) {
    _runTasks();
    if (!stopped_) _wait(turn_());
  }
}

void ClientLoop::_runTasks() {
  std::vector<std::function<void()>> tasks;
  {
    const MutexLock lock(mutex_);
    tasks.swap(tasks_);
  }
  for (const auto& task : tasks) task();
}

void ClientLoop::_wait(LoopWait wait) const {
  wait.descriptors.push_back({wakeUp_, POLLIN, 0});
  ::poll(wait.descriptors.data(), wait.descriptors.size(), millisecondsUntil(wait.deadline));
  std::uint64_t count = 0;
  [[maybe_unused]] const auto taken = ::read(wakeUp_, &count, sizeof count);
}

}  // namespace zelkor
