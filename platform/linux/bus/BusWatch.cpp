#include "platform/linux/bus/BusWatch.h"

#include <systemd/sd-bus.h>
#include <time.h>

#include <utility>

namespace zelkord {
namespace {

// Before others on the loop have their turn.
constexpr int kBusMessagesInATurn = 64;

// When the bus has something to do by itself, which it says in microseconds of CLOCK_MONOTONIC.
SteadyTime nextTurnOfBus(sd_bus* bus) {
  std::uint64_t due = 0;
  if (::sd_bus_get_timeout(bus, &due) < 0 || due == UINT64_MAX) return LoopTimer::kNever;
  timespec now{};
  ::clock_gettime(CLOCK_MONOTONIC, &now);
  const auto sinceStart = std::chrono::seconds(now.tv_sec) + std::chrono::nanoseconds(now.tv_nsec);
  return deadlineAfter(steadyNow(), std::chrono::microseconds(due) - sinceStart);
}

}  // namespace

BusWatch::BusWatch(Loop& loop, BusConnection bus, Events events)
    : loop_(loop), bus_(std::move(bus)), events_(std::move(events)), timer_(loop, [this] {
        loop_.assertCurrent();
        _pump();
      }) {}

BusWatch::~BusWatch() {
  watch_.reset();
  // Without this, what waits to be sent would be waited for.
  ::sd_bus_close(bus_.get());
}

void BusWatch::start() {
  loop_.assertCurrent();
  watch_ = loop_.watch(::sd_bus_get_fd(bus_.get()), waitsFor_, [this](std::uint32_t) {
    loop_.assertCurrent();
    _pump();
  });
  timer_.set(steadyNow());
}

void BusWatch::_pump() {
  for (int i = 0; i < kBusMessagesInATurn; ++i) {
    const int result = ::sd_bus_process(bus_.get(), nullptr);
    if (result < 0) return _lose();
    if (!isReady_ && ::sd_bus_is_ready(bus_.get()) > 0) {
      isReady_ = true;
      if (events_.ready) events_.ready();
    }
    if (result == 0) return _wait();
  }
  timer_.set(steadyNow());
}

void BusWatch::_wait() {
  // poll's events are epoll's.
  const int wanted = ::sd_bus_get_events(bus_.get());
  if (wanted < 0) return _lose();
  const auto events = static_cast<std::uint32_t>(wanted);
  if (std::exchange(waitsFor_, events) != events) {
    loop_.changeEvents(::sd_bus_get_fd(bus_.get()), events);
  }
  timer_.set(nextTurnOfBus(bus_.get()));
}

void BusWatch::_lose() {
  watch_.reset();
  timer_.set(LoopTimer::kNever);
  if (const auto lost = events_.lost) lost();  // a copy: it may be the end of this
}

}  // namespace zelkord
