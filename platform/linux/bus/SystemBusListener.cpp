#include "platform/linux/bus/SystemBusListener.h"

#include <algorithm>
#include <utility>

namespace zelkord {

SystemBusListener::SystemBusListener(Loop& loop, Events events)
    : loop_(loop), events_(std::move(events)), pause_(kShortestBusRetry) {}

SystemBusListener::~SystemBusListener() { stop(); }

void SystemBusListener::start() {
  started_ = true;
  loop_.post(
      [this] {
        loop_.assertCurrent();
        _connect();
      },
      LoopInbox::Runner::OwnThread);
}

void SystemBusListener::stop() {
  if (!std::exchange(started_, false)) return;
  loop_.sync([this] {
    loop_.assertCurrent();
    retry_.reset();
    bus_.reset();
  });
}

void SystemBusListener::_connect() {
  std::string problem;
  auto bus = openSystemBus(&problem);
  if (!bus) return _lost(problem);
  events_.connected(bus.get());
  bus_ = std::make_unique<BusWatch>(loop_, std::move(bus),
                                    BusWatch::Events{[this] {
                                                       loop_.assertCurrent();
                                                       _ready();
                                                     },
                                                     [this] {
                                                       loop_.assertCurrent();
                                                       bus_.reset();
                                                       _lost("it has gone");
                                                     }});
  bus_->start();
}

void SystemBusListener::_ready() {
  isAway_ = false;
  pause_ = kShortestBusRetry;
}

void SystemBusListener::_lost(const std::string& problem) {
  if (!std::exchange(isAway_, true)) events_.away(problem);
  const auto pause = std::exchange(pause_, std::min<Duration>(pause_ * 2, kLongestBusRetry));
  retry_ = loop_.after(pause, [this] {
    loop_.assertCurrent();
    _connect();
  });
}

}  // namespace zelkord
