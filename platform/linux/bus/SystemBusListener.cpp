#include "platform/linux/bus/SystemBusListener.h"

#include <poll.h>
#include <sys/eventfd.h>

#include <algorithm>
#include <utility>

namespace zelkord {

SystemBusListener::SystemBusListener(Events events)
    : events_(std::move(events)), stop_(::eventfd(0, EFD_CLOEXEC)), pause_(kShortestBusRetry) {}

SystemBusListener::~SystemBusListener() { stop(); }

void SystemBusListener::start() {
  if (stop_) thread_ = std::thread([this] { _run(); });
}

void SystemBusListener::stop() {
  const std::uint64_t one = 1;
  if (thread_.joinable() && ::write(stop_.get(), &one, sizeof one) > 0) thread_.join();
}

void SystemBusListener::_run() {
  while (_listen() == BusEnd::Lost && _pause()) {
  }
}

BusEnd SystemBusListener::_listen() {
  std::string problem = "it has gone";
  auto bus = openSystemBus(&problem);
  auto end = BusEnd::Lost;
  if (bus) {
    events_.connected(bus.get());
    end = dispatchBus(bus.get(), stop_.get(), [this] {
      isAway_ = false;
      pause_ = kShortestBusRetry;
    });
    bus.reset();
  }
  if (end == BusEnd::Lost) _tellAway(problem);
  return end;
}

void SystemBusListener::_tellAway(const std::string& problem) {
  if (!std::exchange(isAway_, true)) events_.away(problem);
}

bool SystemBusListener::_pause() {
  const auto pause = std::exchange(pause_, std::min<Duration>(pause_ * 2, kLongestBusRetry));
  pollfd polled = {stop_.get(), POLLIN, 0};
  const auto milliseconds = std::chrono::ceil<std::chrono::milliseconds>(pause).count();
  return ::poll(&polled, 1, static_cast<int>(milliseconds)) <= 0;
}

}  // namespace zelkord
