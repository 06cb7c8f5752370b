#include "platform/linux/queues/QueueCore.h"

#include <chrono>
#include <utility>

#include "base/Check.h"
#include "platform/linux/loop/CarriedWork.h"
#include "platform/linux/queues/BlockingScope.h"
#include "platform/linux/queues/Parker.h"
#include "platform/linux/queues/QueueFrame.h"

namespace zelkord {

namespace {
constexpr std::uint32_t kWaiting = 1u << 31;
constexpr std::uint32_t kExclusive = 1u << 30;
// How many tasks of one queue a worker runs, and for how long it begins another one, before other
// queues get their turn.
constexpr int kBatch = 16;
constexpr auto kBatchTime = std::chrono::microseconds(200);
}  // namespace

QueueCore::QueueCore(std::shared_ptr<Executor> executor, std::string label,
                     QualityOfService quality)
    : executor_(std::move(executor)), label_(std::move(label)), quality_(quality) {}

std::uint32_t QueueCore::_weight(Access access) {
  return access == Access::Shared ? 1 : kExclusive;
}

bool QueueCore::isCurrent(Access least) const { return QueueFrame::find(*this, least) != nullptr; }

void QueueCore::async(Access access, Task task) {
  Grants grants;
  {
    const MutexLock lock(mutex_);
    if (closed_) return;
    grants = _enqueue({access, std::move(task), nullptr});
  }
  _perform(std::move(grants));
}

void QueueCore::sync(Access access, FunctionRef<void()> task) {
  ZK_CHECK(!isCurrent(Access::Shared), "sync on the caller's own queue");
  if (!_tryEnter(access)) _waitToEnter(access);
  std::shared_ptr<const QueueCore> kept;
  {
    QueueFrame frame(*this, access);
    task();
    kept = frame.takeKept();
  }
  _leave(access);
}

bool QueueCore::_tryEnter(Access access) {
  const std::uint32_t obstacles = access == Access::Shared ? kWaiting | kExclusive : ~0u;
  std::uint32_t word = word_.load(std::memory_order_relaxed);
  while ((word & obstacles) == 0) {
    if (word_.compare_exchange_weak(word, word + _weight(access), std::memory_order_acq_rel,
                                    std::memory_order_relaxed)) {
      return true;
    }
  }
  return false;
}

void QueueCore::_waitToEnter(Access access) {
  Parker parker;
  Grants grants;
  {
    const MutexLock lock(mutex_);
    grants = _enqueue({access, nullptr, &parker});
  }
  _perform(std::move(grants));
  if (parker.tryTake()) return;
  const BlockingScope blocking;
  parker.park();
}

// Touches nothing of the queue after the place is given back: somebody may be waiting to free it.
void QueueCore::_leave(Access access) {
  std::uint32_t word = word_.load(std::memory_order_relaxed);
  while ((word & kWaiting) == 0) {
    if (word_.compare_exchange_weak(word, word - _weight(access), std::memory_order_acq_rel,
                                    std::memory_order_relaxed)) {
      return;
    }
  }
  Grants grants;
  {
    const MutexLock lock(mutex_);
    word_.fetch_sub(_weight(access), std::memory_order_acq_rel);
    grants = _grant();
    if (closed_) left_.notifyAll();
  }
  _perform(std::move(grants));
}

QueueCore::Grants QueueCore::_enqueue(Item item) {
  // From here on everybody else comes through the mutex.
  word_.fetch_or(kWaiting, std::memory_order_acq_rel);
  pending_.push_back(std::move(item));
  return _grant();
}

bool QueueCore::_mayBegin(Access access) const {
  const std::uint32_t word = word_.load(std::memory_order_acquire) & ~kWaiting;
  return access == Access::Shared ? (word & kExclusive) == 0 : word == 0;
}

// Gives places to those who wait, in order, as far as possible.
QueueCore::Grants QueueCore::_grant() {
  Grants grants;
  while (!pending_.empty() && _mayBegin(pending_.front().access)) {
    Item item = std::move(pending_.front());
    pending_.pop_front();
    word_.fetch_add(_weight(item.access), std::memory_order_acq_rel);
    if (item.waiter) {
      grants.waiters.push_back(item.waiter);
    } else {
      granted_.push_back(std::move(item));
      ++grants.tickets;
    }
  }
  if (grants.tickets > 0) grants.core = shared_from_this();
  if (pending_.empty() && !closed_) word_.fetch_and(~kWaiting, std::memory_order_acq_rel);
  return grants;
}

void QueueCore::_perform(Grants grants) {
  for (Parker* waiter : grants.waiters) waiter->unpark();
  for (; grants.tickets > 0; --grants.tickets) grants.core->executor_->submit(grants.core);
}

void QueueCore::runTicket() {
  Item item;
  if (!_takeGranted(item)) return;
  int left = kBatch;
  const auto end = std::chrono::steady_clock::now() + kBatchTime;
  do {
    const QueueFrame frame(*this, item.access);
    item.task();
    item.task = nullptr;  // what it captured goes before the next task begins, still on this queue
  } while (_finish(item, --left > 0 && std::chrono::steady_clock::now() < end));
}

void QueueCore::dropTicket() {
  Item item;
  if (!_takeGranted(item)) return;
  do {
    item.task = nullptr;
  } while (_finish(item, true));
}

bool QueueCore::_takeGranted(Item& item) {
  const MutexLock lock(mutex_);
  if (granted_.empty()) return false;  // dropped meanwhile
  item = std::move(granted_.front());
  granted_.pop_front();
  return true;
}

// Gives the place of `item` back. True when another task, now in `item`, got a place that this
// worker is to use.
bool QueueCore::_finish(Item& item, bool mayGoOn) {
  Grants grants;
  bool goesOn = false;
  {
    const MutexLock lock(mutex_);
    word_.fetch_sub(_weight(item.access), std::memory_order_acq_rel);
    grants = _grant();
    if (closed_) left_.notifyAll();
    if (mayGoOn && grants.tickets > 0) {
      --grants.tickets;
      item = std::move(granted_.front());
      granted_.pop_front();
      goesOn = true;
    }
  }
  _perform(std::move(grants));
  if (goesOn) WorkCarrier::passOnAll();
  return goesOn;
}

std::deque<QueueCore::Item> QueueCore::_dropTasks() {
  std::deque<Item> dropped;
  dropped.swap(granted_);
  for (const Item& item : dropped) {
    word_.fetch_sub(_weight(item.access), std::memory_order_acq_rel);
  }
  std::deque<Item> kept;
  for (Item& item : pending_) (item.waiter ? kept : dropped).push_back(std::move(item));
  pending_.swap(kept);
  return dropped;
}

void QueueCore::close() {
  Grants grants;
  std::deque<Item> dropped;
  {
    const MutexLock lock(mutex_);
    closed_ = true;
    word_.fetch_or(kWaiting, std::memory_order_acq_rel);
    dropped = _dropTasks();
    grants = _grant();
  }
  _perform(std::move(grants));
  dropped.clear();

  QueueFrame* const own = QueueFrame::find(*this, Access::Shared);
  if (own) own->keepAlive(shared_from_this());
  const std::uint32_t ownWeight =
      !own ? 0 : _weight(isCurrent(Access::Exclusive) ? Access::Exclusive : Access::Shared);
  const BlockingScope blocking;
  const MutexLock lock(mutex_);
  while (!pending_.empty() ? !own
                           : (word_.load(std::memory_order_acquire) & ~kWaiting) != ownWeight) {
    left_.wait(mutex_);
  }
}

}  // namespace zelkord
