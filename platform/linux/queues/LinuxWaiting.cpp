#include "platform/linux/queues/LinuxWaiting.h"

#include "base/Check.h"
#include "platform/linux/queues/BlockingScope.h"

namespace zelkord {

LinuxSemaphore::LinuxSemaphore(unsigned permits) {
  const MutexLock lock(state_->mutex);
  state_->count = permits;
}

void LinuxSemaphore::signal(unsigned permits) {
  const auto state = state_;
  {
    const MutexLock lock(state->mutex);
    state->count += permits;
  }
  permits == 1 ? state->changed.notifyOne() : state->changed.notifyAll();
}

bool LinuxSemaphore::wait(Duration timeout) {
  WaitState& state = *state_;
  const auto take = [&state]() ZK_REQUIRES(state.mutex) {
    if (state.count == 0) return false;
    --state.count;
    return true;
  };
  {
    const MutexLock lock(state.mutex);
    if (take()) return true;
  }
  if (timeout <= Duration::zero()) return false;
  const BlockingScope blocking(BlockingScope::Refusable::Yes);
  if (blocking.isRefused()) return false;
  const auto deadline = waitDeadline(timeout);
  const MutexLock lock(state.mutex);
  bool inTime = true;
  while (!take()) {
    if (!inTime) return false;
    inTime = state.changed.waitUntil(state.mutex, deadline);
  }
  return true;
}

void LinuxGroup::enter() {
  const MutexLock lock(state_->mutex);
  ++state_->count;
}

void LinuxGroup::leave() {
  const auto state = state_;
  bool last = false;
  {
    const MutexLock lock(state->mutex);
    ZK_CHECK(state->count > 0, "a group left more often than entered");
    last = --state->count == 0;
  }
  if (last) state->changed.notifyAll();
}

bool LinuxGroup::wait(Duration timeout) {
  WaitState& state = *state_;
  {
    const MutexLock lock(state.mutex);
    if (state.count == 0) return true;
  }
  if (timeout <= Duration::zero()) return false;
  const BlockingScope blocking(BlockingScope::Refusable::Yes);
  if (blocking.isRefused()) return false;
  const auto deadline = waitDeadline(timeout);
  const MutexLock lock(state.mutex);
  bool inTime = true;
  while (state.count != 0) {
    if (!inTime) return false;
    inTime = state.changed.waitUntil(state.mutex, deadline);
  }
  return true;
}

}  // namespace zelkord
