#include "platform/linux/ipc/BusDoor.h"

#include <sys/epoll.h>
#include <time.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <utility>

#include "platform/linux/ipc/Introspection.h"

namespace zelkord::ipc {
namespace {

constexpr int kBusMessagesInARow = 64;
// A bus daemon reads always; one that has stopped must not take our memory.
constexpr std::uint64_t kMostBusMessagesQueued = 16'384;
constexpr std::uint64_t kBusCallTimeoutMicroseconds = 10'000'000;

int openSessionBus(const std::string& address, BusPtr& out) {
  sd_bus* bus = nullptr;
  if (address.empty()) {
    const int r = sd_bus_open_user(&bus);
    out.reset(bus);
    return r;
  }
  int r = sd_bus_new(&bus);
  out.reset(bus);
  if (r >= 0) r = sd_bus_set_address(bus, address.c_str());
  if (r >= 0) r = sd_bus_set_bus_client(bus, 1);
  if (r >= 0) r = sd_bus_start(bus);
  return r;
}

std::uint64_t monotonicMicroseconds() {
  timespec now{};
  ::clock_gettime(CLOCK_MONOTONIC, &now);
  return static_cast<std::uint64_t>(now.tv_sec) * 1'000'000 +
         static_cast<std::uint64_t>(now.tv_nsec) / 1000;
}

}  // namespace

BusName acquireBusName(const std::string& address, const std::string& name) {
  BusName result;
  int r = openSessionBus(address, result.bus);
  if (r >= 0) {
    sd_bus_set_method_call_timeout(result.bus.get(), kBusCallTimeoutMicroseconds);
    sd_bus_set_exit_on_disconnect(result.bus.get(), 0);
    r = sd_bus_request_name(result.bus.get(), name.c_str(), 0);
  }
  if (r >= 0) {
    result.outcome = BusName::Outcome::Owned;
    return result;
  }
  result.error = -r;
  if (r == -EEXIST) result.outcome = BusName::Outcome::Taken;
  result.bus.reset();
  return result;
}

BusDoor::BusDoor(IpcContext& context, BusPtr bus, ListenerConfiguration configuration,
                 std::shared_ptr<ListenerDelegate> delegate, std::string serviceInterface,
                 OpenPrivate openPrivate)
    : context_(context),
      port_(std::make_shared<DelegatePort>(context, std::move(delegate))),
      openPrivate_(std::move(openPrivate)),
      dispatcher_(context, std::move(configuration), std::move(serviceInterface)),
      bus_(std::move(bus)) {}

void BusDoor::start() {
  sd_bus_slot* slot = nullptr;
  sd_bus_add_filter(bus_.get(), &slot, &BusDoor::_onMessage, this);
  filter_.reset(slot);
  events_ = EPOLLIN;
  watch_ =
      context_.loop.watch(sd_bus_get_fd(bus_.get()), events_, [this](std::uint32_t) { _pump(); });
  _pump();
}

void BusDoor::close() {
  *self_ = nullptr;
  watch_.reset();
  timeout_.reset();
  callers_.clear();
  filter_.reset();
  bus_.reset();
}

int BusDoor::_onMessage(sd_bus_message* message, void* self, sd_bus_error*) {
  return static_cast<BusDoor*>(self)->_take(message);
}

int BusDoor::_take(sd_bus_message* message) {
  std::uint8_t type = 0;
  sd_bus_message_get_type(message, &type);
  const char* interface = sd_bus_message_get_interface(message);
  if (type != SD_BUS_MESSAGE_METHOD_CALL) return 0;
  if (interface && std::strcmp(interface, "org.freedesktop.DBus.Peer") == 0) return 0;
  const char* sender = sd_bus_message_get_sender(message);
  if (!sender) return 1;
  auto& caller = callers_[sender];
  if (!caller) {
    caller = std::make_unique<BusCaller>(*this, context_, bus_.get(), sender);
    caller->start();
  }
  caller->take(message);
  return 1;
}

void BusDoor::_pump() {
  for (int i = 0; i < kBusMessagesInARow; ++i) {
    const int r = sd_bus_process(bus_.get(), nullptr);
    if (r < 0) return _lost();
    if (r == 0) return _updateWaiting();
  }
  _updateWaiting();
  if (std::exchange(pumpsSoon_, true)) return;
  context_.loop.soon([self = self_] {
    if (!*self) return;
    (*self)->pumpsSoon_ = false;
    (*self)->_pump();
  });
}

// Waits for what sd-bus waits for: its descriptor, and the end of a call to the driver.
void BusDoor::_updateWaiting() {
  std::uint64_t writes = 0;
  sd_bus_get_n_queued_write(bus_.get(), &writes);
  const std::uint32_t events = writes > 0 ? EPOLLIN | EPOLLOUT : EPOLLIN;
  if (std::exchange(events_, events) != events) {
    context_.loop.changeEvents(sd_bus_get_fd(bus_.get()), events);
  }
  std::uint64_t due = UINT64_MAX;
  if (sd_bus_get_timeout(bus_.get(), &due) < 0 || due == UINT64_MAX) return timeout_.reset();
  const auto now = monotonicMicroseconds();
  timeout_ = context_.loop.after(std::chrono::microseconds(due > now ? due - now : 0),
                                 [this] { _pump(); });
}

void BusDoor::send(MessagePtr message, std::size_t) {
  std::uint64_t writes = 0;
  sd_bus_get_n_queued_write(bus_.get(), &writes);
  if (writes >= kMostBusMessagesQueued) return;
  const int r = sd_bus_send(bus_.get(), message.get(), nullptr);
  if (r < 0) context_.log.error("message not sent on the bus: {}", std::strerror(-r));
  if (!pumpsSoon_) _updateWaiting();
}

void BusDoor::signal(const std::string& destination, const std::string& interface,
                     const std::string& member, std::optional<std::string> text) {
  sd_bus_message* message = nullptr;
  if (!bus_ || sd_bus_message_new_signal(bus_.get(), &message, kObjectPath.data(),
                                         interface.c_str(), member.c_str()) < 0) {
    return;
  }
  MessagePtr owned(message);
  if (!destination.empty()) sd_bus_message_set_destination(message, destination.c_str());
  if (text) sd_bus_message_append_basic(message, 's', text->c_str());
  send(std::move(owned), 256);
}

void BusDoor::vanished(const std::string& name) {
  const auto found = callers_.find(name);
  if (found == callers_.end()) return;
  found->second->end();
  context_.loop.soon([self = self_, key = name] {
    if (*self) (*self)->callers_.erase(key);
  });
}

void BusDoor::_lost() {
  context_.log.error("the session bus is gone; the private socket is still served");
  watch_.reset();
  timeout_.reset();
  for (const auto& [name, caller] : callers_) caller->end();
  context_.loop.soon([self = self_] {
    if (*self) (*self)->close();
  });
}

}  // namespace zelkord::ipc
