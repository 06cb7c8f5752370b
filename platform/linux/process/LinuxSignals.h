#pragma once

#include <initializer_list>
#include <memory>

#include "platform/api/Signals.h"

namespace zelkord {

// Signals through a handler that only notes them and wakes one thread, which posts the tasks. A
// signal that comes again before its task was posted counts once. The signal's former disposition
// returns with the end of its last subscription.
//
// The process has one signal table: at most one object at a time. Its thread begins with the first
// subscription.
//
// Threading: any thread. Ownership: queues outlive their subscriptions; those may outlive this
// object.
class LinuxSignals final : public Signals {
 public:
  LinuxSignals();
  ~LinuxSignals() override;
  LinuxSignals(const LinuxSignals&) = delete;
  LinuxSignals& operator=(const LinuxSignals&) = delete;

  // Requires a signal from 1 to 63.
  Subscription on(int signal, WorkQueue& queue, Task task) override;

  // Once one of these signals has come while it was subscribed to, the process ends with status 0
  // at the latest after `limit` of real time: its tasks may wait for workers, disks and locks, and
  // nobody waits for them any longer. Before the first subscription.
  void endProcessAfter(Duration limit, std::initializer_list<int> signals);

 private:
  struct State;
  const std::shared_ptr<State> state_;
};

}  // namespace zelkord
