#include "platform/testing/TimelineCore.h"

#include <algorithm>

#include "base/Check.h"

namespace zelkord {

void TimelineCore::_checkThread() const {
  ZK_CHECK(std::this_thread::get_id() == thread_, "a manual timeline belongs to one thread");
}

TimelineCore::Key TimelineCore::post(const QueuePointer& queue, Duration delay, Access access,
                                     Task task) {
  _checkThread();
  const Key key{deadlineAfter(now_, delay), nextSequence_++};
  agenda_.emplace(key, Entry{queue, access, std::move(task)});
  if (queue->runsAtOnce) _runAllDue(*queue);
  return key;
}

void TimelineCore::_runAllDue(const Queue& queue) {
  const Key end{now_, nextSequence_};
  for (auto i = _firstOf(queue, end); i != agenda_.end() && _isFree(queue, i->second.access);
       i = _firstOf(queue, end)) {
    _run(i, true);
  }
}

void TimelineCore::cancel(Key key) {
  _checkThread();
  // The node outlives the look-up: the task's captures may cancel in turn.
  const auto released = agenda_.extract(key);
}

void TimelineCore::drop(const Queue* queue) {
  _checkThread();
  for (auto i = agenda_.begin(); i != agenda_.end();) {
    if (queue && i->second.queue.get() != queue) {
      ++i;
      continue;
    }
    const auto released = agenda_.extract(i);
    i = agenda_.upper_bound(released.key());
  }
}

bool TimelineCore::_isFree(const Queue& queue, Access access) {
  return !queue.exclusiveRunning && (access == Access::Shared || queue.sharedRunning == 0);
}

// The first task due by `limit` whose queue lets it begin; a task that is held back holds those
// behind it.
TimelineCore::Agenda::iterator TimelineCore::_runnable(SteadyTime limit) {
  std::vector<const Queue*> held;
  for (auto i = agenda_.begin(); i != agenda_.end() && i->first.first <= limit; ++i) {
    const Queue* queue = i->second.queue.get();
    if (std::find(held.begin(), held.end(), queue) != held.end()) continue;
    if (_isFree(*queue, i->second.access)) return i;
    held.push_back(queue);
  }
  return agenda_.end();
}

TimelineCore::Agenda::iterator TimelineCore::_firstOf(const Queue& queue, Key before) {
  for (auto i = agenda_.begin(); i != agenda_.end() && i->first < before; ++i) {
    if (i->second.queue.get() == &queue) return i;
  }
  return agenda_.end();
}

void TimelineCore::_enter(Frame frame) {
  Queue& queue = *frame.queue;
  ZK_CHECK(_isFree(queue, frame.access),
           "a task would wait for a queue whose own task waits further out on the manual timeline");
  if (frame.access == Access::Exclusive) {
    queue.exclusiveRunning = true;
  } else {
    ++queue.sharedRunning;
  }
  frames_.push_back(std::move(frame));
}

void TimelineCore::_leave() {
  const Frame frame = std::move(frames_.back());
  frames_.pop_back();
  if (frame.access == Access::Exclusive) {
    frame.queue->exclusiveRunning = false;
  } else {
    --frame.queue->sharedRunning;
  }
}

void TimelineCore::_run(Agenda::iterator place, bool startsChain) {
  auto node = agenda_.extract(place);
  moveTo(node.key().first);
  Entry& entry = node.mapped();
  _enter({entry.queue, entry.access, startsChain});
  entry.task();
  entry.task = nullptr;  // released on its queue
  _leave();
}

void TimelineCore::sync(const QueuePointer& queue, Access access, FunctionRef<void()> task) {
  _checkThread();
  ZK_CHECK(queue->global || !isCurrent(*queue, Access::Shared), "sync on the caller's own queue");
  if (!queue->global) {
    const Key mine{now_, nextSequence_++};
    for (auto i = _firstOf(*queue, mine); i != agenda_.end(); i = _firstOf(*queue, mine))
      _run(i, true);
  }
  _enter({queue, access, frames_.empty()});
  task();
  _leave();
}

bool TimelineCore::isCurrent(const Queue& queue, Access access) const {
  if (std::this_thread::get_id() != thread_) return false;
  for (auto frame = frames_.rbegin(); frame != frames_.rend(); ++frame) {
    if (frame->queue.get() == &queue &&
        (access == Access::Shared || frame->access == Access::Exclusive)) {
      return true;
    }
    if (frame->startsChain) return false;
  }
  return false;
}

bool TimelineCore::pump(FunctionRef<bool()> ready, SteadyTime deadline) {
  _checkThread();
  while (!ready()) {
    if (now_ > deadline) return false;
    const auto place = _runnable(deadline);
    if (place == agenda_.end()) {
      ZK_CHECK(deadline != SteadyTime::max(), "an endless wait with nothing left to run");
      moveTo(deadline);
      return ready();
    }
    _run(place, true);
  }
  return true;
}

void TimelineCore::runDue(SteadyTime limit) {
  _checkThread();
  for (auto i = _runnable(limit); i != agenda_.end(); i = _runnable(limit)) _run(i, true);
}

void TimelineCore::moveTo(SteadyTime time) { now_ = std::max(now_, time); }

}  // namespace zelkord
