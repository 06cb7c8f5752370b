#include "platform/linux/memory_pressure/PressureWatch.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/eventfd.h>
#include <systemd/sd-bus.h>

#include <cstring>

namespace zelkord {
namespace {

constexpr const char* kPressureTrigger = "full 100000 2000000";  // microseconds: stall, window
constexpr unsigned char kCriticalLevel = 255;

class KernelPressureWatch final : public PressureWatch {
 public:
  KernelPressureWatch(Descriptor pressure, std::function<void()> critical)
      : pressure_(std::move(pressure)),
        stop_(::eventfd(0, EFD_CLOEXEC)),
        critical_(std::move(critical)),
        thread_([this] { run(); }) {}

  ~KernelPressureWatch() override {
    ::eventfd_write(stop_.get(), 1);
    thread_.join();
  }

 private:
  void run() {
    pollfd waited[] = {{pressure_.get(), POLLPRI, 0}, {stop_.get(), POLLIN, 0}};
    for (;;) {
      if (::poll(waited, 2, -1) < 0 && errno != EINTR) return;
      if (waited[1].revents || (waited[0].revents & POLLERR)) return;
      if (waited[0].revents & POLLPRI) critical_();
    }
  }

  const Descriptor pressure_;
  const Descriptor stop_;
  const std::function<void()> critical_;
  std::thread thread_;
};

class LowMemoryWatch final : public PressureWatch {
 public:
  LowMemoryWatch(std::function<void()> critical, std::function<void()> missing)
      : critical_(std::move(critical)),
        bus_({[this](sd_bus* bus) { connected(bus); },
              [missing = std::move(missing)](const std::string&) { missing(); }}) {
    bus_.start();
  }

 private:
  void connected(sd_bus* bus) {
    sd_bus_match_signal_async(
        bus, nullptr, "org.freedesktop.LowMemoryMonitor", "/org/freedesktop/LowMemoryMonitor",
        "org.freedesktop.LowMemoryMonitor", "LowMemoryWarning", warned, nullptr, this);
  }
  static int warned(sd_bus_message* message, void* self, sd_bus_error*) {
    unsigned char level = 0;
    if (sd_bus_message_read_basic(message, 'y', &level) >= 0 && level == kCriticalLevel) {
      static_cast<LowMemoryWatch*>(self)->critical_();
    }
    return 0;
  }

  const std::function<void()> critical_;
  SystemBusListener bus_;  // last: its thread ends before the call-back goes
};

}  // namespace

std::unique_ptr<PressureWatch> watchKernelPressure(const char* path,
                                                   std::function<void()> critical) {
  Descriptor pressure(::open(path, O_RDWR | O_NONBLOCK | O_CLOEXEC));
  if (!pressure) return nullptr;
  const auto length = std::strlen(kPressureTrigger) + 1;
  if (::write(pressure.get(), kPressureTrigger, length) < 0) return nullptr;
  return std::make_unique<KernelPressureWatch>(std::move(pressure), std::move(critical));
}

std::unique_ptr<PressureWatch> watchLowMemoryMonitor(std::function<void()> critical,
                                                     std::function<void()> missing) {
  return std::make_unique<LowMemoryWatch>(std::move(critical), std::move(missing));
}

}  // namespace zelkord
