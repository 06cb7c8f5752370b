#include "platform/linux/bus/BusThread.h"

#include <utility>

namespace zelkord {

BusThread::BusThread(BusConnection bus)
    : loop_("zk-bus"), watch_(loop_, std::move(bus), {.lost = [this] { lost_(); }}) {}

BusThread::~BusThread() { loop_.stop(); }

void BusThread::start(std::function<void()> lost) {
  lost_ = std::move(lost);
  loop_.post([this] { watch_.start(); }, LoopInbox::Runner::OwnThread);
}

}  // namespace zelkord
