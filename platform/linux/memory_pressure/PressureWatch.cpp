#include "platform/linux/memory_pressure/PressureWatch.h"

#include <fcntl.h>
#include <systemd/sd-bus.h>

#include <cstring>
#include <utility>

#include "platform/linux/system/Descriptor.h"

namespace zelkord {
namespace {

constexpr const char* kPressureTrigger = "full 100000 2000000";  // microseconds: stall, window
constexpr unsigned char kCriticalLevel = 255;

class KernelPressureWatch final : public PressureWatch {
 public:
  KernelPressureWatch(Loop& loop, Descriptor pressure, std::function<void()> critical)
      : loop_(loop), pressure_(std::move(pressure)), critical_(std::move(critical)) {
    loop_.post([this] { _begin(); }, LoopInbox::Runner::OwnThread);
  }

  ~KernelPressureWatch() override {
    loop_.sync([this] {
      loop_.assertCurrent();
      watch_.reset();
    });
  }

 private:
  void _begin() {
    loop_.assertCurrent();
    watch_ = loop_.watch(pressure_.get(), EPOLLPRI, [this](std::uint32_t events) {
      loop_.assertCurrent();
      _ready(events);
    });
  }

  void _ready(std::uint32_t events) ZK_REQUIRES(loop_) {
    if (events & EPOLLERR) return watch_.reset();
    if (events & EPOLLPRI) critical_();
  }

  Loop& loop_;
  const Descriptor pressure_;
  const std::function<void()> critical_;
  Subscription watch_ ZK_ON(loop_);
};

class LowMemoryWatch final : public PressureWatch {
 public:
  LowMemoryWatch(Loop& loop, std::function<void()> critical, std::function<void()> missing)
      : critical_(std::move(critical)),
        bus_(loop, {[this](sd_bus* bus) { _connected(bus); },
                    [missing = std::move(missing)](const std::string&) { missing(); }}) {
    bus_.start();
  }

 private:
  void _connected(sd_bus* bus) {
    sd_bus_match_signal_async(
        bus, nullptr, "org.freedesktop.LowMemoryMonitor", "/org/freedesktop/LowMemoryMonitor",
        "org.freedesktop.LowMemoryMonitor", "LowMemoryWarning", _warned, nullptr, this);
  }
  static int _warned(sd_bus_message* message, void* self, sd_bus_error*) {
    unsigned char level = 0;
    if (sd_bus_message_read_basic(message, 'y', &level) >= 0 && level == kCriticalLevel) {
      static_cast<LowMemoryWatch*>(self)->critical_();
    }
    return 0;
  }

  const std::function<void()> critical_;
  SystemBusListener bus_;  // last: it ends before the call-back goes
};

}  // namespace

std::unique_ptr<PressureWatch> watchKernelPressure(Loop& loop, const char* path,
                                                   std::function<void()> critical) {
  Descriptor pressure(::open(path, O_RDWR | O_NONBLOCK | O_CLOEXEC));
  if (!pressure) return nullptr;
  const auto length = std::strlen(kPressureTrigger) + 1;
  if (::write(pressure.get(), kPressureTrigger, length) < 0) return nullptr;
  return std::make_unique<KernelPressureWatch>(loop, std::move(pressure), std::move(critical));
}

std::unique_ptr<PressureWatch> watchLowMemoryMonitor(Loop& loop, std::function<void()> critical,
                                                     std::function<void()> missing) {
  return std::make_unique<LowMemoryWatch>(loop, std::move(critical), std::move(missing));
}

}  // namespace zelkord
