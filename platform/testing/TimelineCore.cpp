#include "platform/testing/TimelineCore.h"

#include <algorithm>

#include "base/Check.h"

namespace zelkord {

void TimelineCore::checkThread() const {
  ZK_CHECK(std::this_thread::get_id() == thread_, "a manual timeline belongs to one thread");
}

TimelineCore::Key TimelineCore::post(const QueuePointer& queue, Duration delay, Access access,
                                     Task task) {
  checkThread();
  const Key key{deadlineAfter(now_, delay), nextSequence_++};
  agenda_.emplace(key, Entry{queue, access, std::move(task)});
  if (queue->runsAtOnce) runAllDue(*queue);
  return key;
}

void TimelineCore::runAllDue(const Queue& queue) {
  const Key end{now_, nextSequence_};
  for (auto i = firstOf(queue, end); i != agenda_.end() && isFree(queue, i->second.access);
       i = firstOf(queue, end)) {
    run(i, true);
  }
}

void TimelineCore::cancel(Key key) {
  checkThread();
  // The node outlives the look-up: the task's captures may cancel in turn.
  const auto released = agenda_.extract(key);
}

void TimelineCore::drop(const Queue* queue) {
  checkThread();
  for (auto i = agenda_.begin(); i != agenda_.end();) {
    if (queue && i->second.queue.get() != queue) {
      ++i;
      continue;
    }
    const auto released = agenda_.extract(i);
    i = agenda_.upper_bound(released.key());
  }
}

bool TimelineCore::isFree(const Queue& queue, Access access) {
  return !queue.exclusiveRunning && (access == Access::Shared || queue.sharedRunning == 0);
}

// The first task due by `limit` whose queue lets it begin; a task that is held back holds those
// behind it.
TimelineCore::Agenda::iterator TimelineCore::runnable(SteadyTime limit) {
  std::vector<const Queue*> held;
  for (auto i = agenda_.begin(); i != agenda_.end() && i->first.first <= limit; ++i) {
    const Queue* queue = i->second.queue.get();
    if (std::find(held.begin(), held.end(), queue) != held.end()) continue;
    if (isFree(*queue, i->second.access)) return i;
    held.push_back(queue);
  }
  return agenda_.end();
}

TimelineCore::Agenda::iterator TimelineCore::firstOf(const Queue& queue, Key before) {
  for (auto i = agenda_.begin(); i != agenda_.end() && i->first < before; ++i) {
    if (i->second.queue.get() == &queue) return i;
  }
  return agenda_.end();
}

void TimelineCore::enter(Frame frame) {
  Queue& queue = *frame.queue;
  ZK_CHECK(isFree(queue, frame.access),
           "a task would wait for a queue whose own task waits further out on the manual timeline");
  if (frame.access == Access::Exclusive) {
    queue.exclusiveRunning = true;
  } else {
    ++queue.sharedRunning;
  }
  frames_.push_back(std::move(frame));
}

void TimelineCore::leave() {
  const Frame frame = std::move(frames_.back());
  frames_.pop_back();
  if (frame.access == Access::Exclusive) {
    frame.queue->exclusiveRunning = false;
  } else {
    --frame.queue->sharedRunning;
  }
}

void TimelineCore::run(Agenda::iterator place, bool startsChain) {
  auto node = agenda_.extract(place);
  moveTo(node.key().first);
  Entry& entry = node.mapped();
  enter({entry.queue, entry.access, startsChain});
  entry.task();
  entry.task = nullptr;  // released on its queue
  leave();
}

void TimelineCore::sync(const QueuePointer& queue, Access access, FunctionRef<void()> task) {
  checkThread();
  ZK_CHECK(queue->global || !isCurrent(*queue, Access::Shared), "sync on the caller's own queue");
  if (!queue->global) {
    const Key mine{now_, nextSequence_++};
    for (auto i = firstOf(*queue, mine); i != agenda_.end(); i = firstOf(*queue, mine))
      run(i, true);
  }
  enter({queue, access, frames_.empty()});
  task();
  leave();
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
  checkThread();
  while (!ready()) {
    if (now_ > deadline) return false;
    const auto place = runnable(deadline);
    if (place == agenda_.end()) {
      ZK_CHECK(deadline != SteadyTime::max(), "an endless wait with nothing left to run");
      moveTo(deadline);
      return ready();
    }
    run(place, true);
  }
  return true;
}

void TimelineCore::runDue(SteadyTime limit) {
  checkThread();
  for (auto i = runnable(limit); i != agenda_.end(); i = runnable(limit)) run(i, true);
}

void TimelineCore::moveTo(SteadyTime time) { now_ = std::max(now_, time); }

}  // namespace zelkord
