#include "platform/linux/bus/SystemBus.h"

#include <poll.h>
#include <sys/eventfd.h>
#include <systemd/sd-bus.h>
#include <time.h>

#include <algorithm>
#include <climits>
#include <cstring>

namespace zelkord {
namespace {

constexpr std::uint64_t kBusCallMicroseconds = 1'000'000;

// How long a poll may sleep before the bus has something to do by itself, in milliseconds; -1: for
// ever.
int busSleep(sd_bus* bus) {
  std::uint64_t due = 0;
  if (::sd_bus_get_timeout(bus, &due) < 0 || due == UINT64_MAX) return -1;
  timespec now{};
  ::clock_gettime(CLOCK_MONOTONIC, &now);
  const auto micros = static_cast<std::uint64_t>(now.tv_sec) * 1'000'000 +
                      static_cast<std::uint64_t>(now.tv_nsec) / 1000;
  return due <= micros
             ? 0
             : static_cast<int>(std::min<std::uint64_t>((due - micros) / 1000 + 1, INT_MAX));
}

}  // namespace

void BusCloser::operator()(sd_bus* bus) const { ::sd_bus_flush_close_unref(bus); }

BusConnection openSystemBus(std::string* problem) {
  sd_bus* raw = nullptr;
  const int result = ::sd_bus_open_system(&raw);
  if (result < 0 && problem) *problem = std::strerror(-result);
  return BusConnection(result < 0 ? nullptr : raw);
}

std::string readBusProperty(sd_bus* bus, const char* service, const char* path,
                            const char* interface, const char* property) {
  sd_bus_message* call = nullptr;
  sd_bus_message* reply = nullptr;
  std::string text;
  const char* value = nullptr;
  if (::sd_bus_message_new_method_call(bus, &call, service, path, "org.freedesktop.DBus.Properties",
                                       "Get") >= 0 &&
      ::sd_bus_message_append(call, "ss", interface, property) >= 0 &&
      ::sd_bus_call(bus, call, kBusCallMicroseconds, nullptr, &reply) >= 0 &&
      ::sd_bus_message_read(reply, "v", "s", &value) >= 0) {
    text = value;
  }
  ::sd_bus_message_unref(call);
  ::sd_bus_message_unref(reply);
  return text;
}

BusThread::BusThread(BusConnection bus) : bus_(std::move(bus)), stop_(::eventfd(0, EFD_CLOEXEC)) {}

BusThread::~BusThread() { stop(); }

void BusThread::stop() {
  const std::uint64_t one = 1;
  if (thread_.joinable() && ::write(stop_.get(), &one, sizeof one) > 0) thread_.join();
}

void BusThread::start(std::function<void()> lost) {
  if (!stop_) return;
  thread_ = std::thread([this, lost = std::move(lost)] {
    if (dispatchBus(bus_.get(), stop_.get(), [] {}) == BusEnd::Lost) lost();
  });
}

BusEnd dispatchBus(sd_bus* bus, int stop, const std::function<void()>& ready) {
  bool isReady = false;
  while (true) {
    int result = 1;
    while (result > 0) result = ::sd_bus_process(bus, nullptr);
    if (!isReady && ::sd_bus_is_ready(bus) > 0) {
      isReady = true;
      ready();
    }
    const int events = result < 0 ? result : ::sd_bus_get_events(bus);
    if (events < 0) return BusEnd::Lost;
    pollfd polled[] = {{::sd_bus_get_fd(bus), static_cast<short>(events), 0}, {stop, POLLIN, 0}};
    ::poll(polled, 2, busSleep(bus));
    if (polled[1].revents) return BusEnd::Stopped;
  }
}

}  // namespace zelkord
