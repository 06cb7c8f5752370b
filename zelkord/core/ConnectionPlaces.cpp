#include "zelkord/core/ConnectionPlaces.h"

#include <algorithm>

namespace zelkord {
namespace {

constexpr Duration kLongestWait = 100ms;

}  // namespace

ConnectionPlaces::ConnectionPlaces(WorkQueues& queues, std::size_t places)
    : queue_(queues.makeSerialQueue("com.quenta.zelkord.connectionPlaces")), free_(places) {}

void ConnectionPlaces::take(Decision decide) {
  queue_->async([self = shared_from_this(), decide = std::move(decide)] { self->_take(decide); });
}

void ConnectionPlaces::_take(const Decision& decide) {
  queue_->assertCurrent();
  if (free_ == 0) return _wait(decide);
  --free_;
  decide(_place());
}

void ConnectionPlaces::_wait(const Decision& decide) {
  queue_->assertCurrent();
  const auto id = nextId_++;
  auto timeout = queue_->after(
      kLongestWait,
      [weak = weak_from_this(), id] {
        if (const auto self = weak.lock()) self->_timeOut(id);
      },
      TimeBase::Real);
  waiters_.push_back({id, decide, std::move(timeout)});
}

Subscription ConnectionPlaces::_place() {
  return Subscription([weak = weak_from_this()] {
    const auto self = weak.lock();
    if (self) self->queue_->async([self] { self->_giveBack(); });
  });
}

void ConnectionPlaces::_giveBack() {
  queue_->assertCurrent();
  if (waiters_.empty()) {
    ++free_;
    return;
  }
  const auto waiter = std::move(waiters_.front());
  waiters_.pop_front();
  waiter.decide(_place());
}

void ConnectionPlaces::_timeOut(std::uint64_t id) {
  queue_->assertCurrent();
  const auto found = std::find_if(waiters_.begin(), waiters_.end(),
                                  [id](const Waiter& waiter) { return waiter.id == id; });
  if (found == waiters_.end()) return;
  const auto waiter = std::move(*found);
  waiters_.erase(found);
  waiter.decide(std::nullopt);
}

}  // namespace zelkord
