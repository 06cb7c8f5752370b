#include "platform/linux/loop/LoopInbox.h"

#include <sys/eventfd.h>

#include <utility>

#include "base/Check.h"
#include "platform/linux/loop/CarriedWork.h"
#include "platform/linux/system/ServiceThread.h"

namespace zelkord {

namespace {
// How often a thread that was lent the loop looks for more tasks, before they are the loop's own
// thread's.
constexpr int kLentRounds = 4;
}  // namespace

LoopInbox::LoopInbox(LoopHost& host)
    : host_(host), wakeUp_(::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {
  ZK_CHECK(wakeUp_, "no eventfd for a loop");
}

bool LoopInbox::post(Task task, Runner runner) {
  bool isLent = false;
  {
    const MutexLock lock(mutex_);
    if (state_ == State::Closed) return false;
    tasks_.push_back(std::move(task));
    // Otherwise whoever has the loop looks here, or whoever posted before has woken its thread.
    if (state_ != State::Asleep || tasks_.size() > 1) return true;
    isLent = runner == Runner::Anybody && mayBeLentLoops();
    if (isLent) state_ = State::Lent;
  }
  isLent ? _runLent() : void(::eventfd_write(wakeUp_.get(), 1));
  return true;
}

void LoopInbox::_runLent() {
  // Others' tasks: what they bring does not wait for what the calling thread does besides.
  const WorkCarrier::Pause pause;
  owner_ = std::this_thread::get_id();
  for (int round = 0; round < kLentRounds; ++round) {
    auto tasks = take();
    if (tasks.empty()) break;
    host_.runPosted(std::move(tasks));
  }
  const bool needsOwnThread = host_.needsOwnThread();
  owner_ = std::thread::id();
  if (_endLoan() || needsOwnThread) ::eventfd_write(wakeUp_.get(), 1);
}

// Whether the loop's thread is to be woken for tasks. After this the loop may be gone.
bool LoopInbox::_endLoan() {
  const MutexLock lock(mutex_);
  state_ = State::Asleep;
  if (awaited_) returned_.notifyOne();
  return !tasks_.empty();
}

std::vector<Task> LoopInbox::take() {
  const MutexLock lock(mutex_);
  return std::exchange(tasks_, {});
}

bool LoopInbox::beginSleep() {
  const MutexLock lock(mutex_);
  if (!tasks_.empty()) return false;
  state_ = State::Asleep;
  owner_ = std::thread::id();
  return true;
}

void LoopInbox::endSleep() {
  const MutexLock lock(mutex_);
  awaited_ = true;
  while (state_ == State::Lent) returned_.wait(mutex_);
  awaited_ = false;
  state_ = State::Awake;
  owner_ = std::this_thread::get_id();
}

std::vector<Task> LoopInbox::close() {
  const MutexLock lock(mutex_);
  state_ = State::Closed;
  return std::exchange(tasks_, {});
}

}  // namespace zelkord
