#include "platform/linux/loop/LoopWatches.h"

#include <utility>

#include "base/Check.h"

namespace zelkord {
namespace {

std::uint64_t keyOf(int descriptor, std::uint32_t serial) {
  return std::uint64_t{serial} << 32 | static_cast<std::uint32_t>(descriptor);
}

}  // namespace

LoopWatches::LoopWatches() : epoll_(::epoll_create1(EPOLL_CLOEXEC)) {
  ZK_CHECK(epoll_, "no epoll for a loop");
}

void LoopWatches::addWaker(int descriptor) {
  _set(EPOLL_CTL_ADD, EPOLL_CTL_MOD, descriptor, 0, EPOLLIN | EPOLLET);
}

std::uint32_t LoopWatches::add(int descriptor, std::uint32_t events, Ready ready) {
  const auto serial = ++lastSerial_;
  watched_[descriptor] = std::make_shared<const Watched>(Watched{serial, std::move(ready)});
  _set(EPOLL_CTL_ADD, EPOLL_CTL_MOD, descriptor, serial, events);
  return serial;
}

void LoopWatches::change(int descriptor, std::uint32_t events) {
  const auto found = watched_.find(descriptor);
  if (found == watched_.end()) return;
  _set(EPOLL_CTL_MOD, EPOLL_CTL_ADD, descriptor, found->second->serial, events);
}

void LoopWatches::clear() { const auto dropped = std::exchange(watched_, {}); }

// A descriptor that was closed before its watch ended is forgotten by epoll, not here; and the
// other way round when another one has its number now.
void LoopWatches::_set(int operation, int otherwise, int descriptor, std::uint32_t serial,
                       std::uint32_t events) {
  epoll_event event{};
  event.events = events;
  event.data.u64 = keyOf(descriptor, serial);
  if (::epoll_ctl(epoll_.get(), operation, descriptor, &event) == 0) return;
  ::epoll_ctl(epoll_.get(), otherwise, descriptor, &event);
}

void LoopWatches::remove(int descriptor, std::uint32_t serial) {
  const auto found = watched_.find(descriptor);
  if (found == watched_.end() || found->second->serial != serial) return;
  const auto released = std::move(found->second);
  watched_.erase(found);
  ::epoll_ctl(epoll_.get(), EPOLL_CTL_DEL, descriptor, nullptr);
}

void LoopWatches::wait(Wait wait) {
  count_ = ::epoll_wait(epoll_.get(), events_.data(), kEventsAtOnce, wait == Wait::Yes ? -1 : 0);
}

void LoopWatches::dispatch(FunctionRef<void()> before) {
  for (int i = 0; i < count_; ++i) {
    const auto& event = events_[static_cast<std::size_t>(i)];
    const std::uint64_t key = event.data.u64;  // the event is packed: no reference to its member
    const auto found = watched_.find(static_cast<int>(key & UINT32_MAX));
    if (found == watched_.end() || found->second->serial != key >> 32) continue;
    const auto watched = found->second;  // may be unwatched by its own call
    before();
    watched->ready(event.events);
  }
}

}  // namespace zelkord
