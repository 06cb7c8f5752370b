#include "platform/linux/queues/MainLoop.h"

#include <utility>

#include "platform/linux/queues/QueueCore.h"

namespace zelkord {

void MainLoop::submit(std::shared_ptr<QueueCore> core) {
  const MutexLock lock(mutex_);
  tickets_.push_back(std::move(core));
  changed_.notifyOne();
}

std::shared_ptr<QueueCore> MainLoop::_next() {
  const MutexLock lock(mutex_);
  while (tickets_.empty() && !stopped_) changed_.wait(mutex_);
  if (stopped_) return nullptr;
  auto ticket = std::move(tickets_.front());
  tickets_.pop_front();
  return ticket;
}

void MainLoop::run() {
  while (const auto ticket = _next()) ticket->runTicket();
  const MutexLock lock(mutex_);
  stopped_ = false;
}

void MainLoop::stop() {
  const MutexLock lock(mutex_);
  stopped_ = true;
  changed_.notifyAll();
}

}  // namespace zelkord
