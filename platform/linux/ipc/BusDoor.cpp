#include "platform/linux/ipc/BusDoor.h"

#include <sys/epoll.h>
#include <time.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <utility>

#include "platform/linux/ipc/Introspection.h"
#include "platform/linux/ipc/WireEncoding.h"

namespace zelkord::ipc {
namespace {

constexpr int kBusMessagesInARow = 64;
constexpr pid_t kNoProcess = 0;
// A bus daemon reads always; one that has stopped must not take our memory.
constexpr std::size_t kMostBusMessagesQueued = 16'384;
constexpr std::size_t kMostBusBytesQueued = 64u << 20;
constexpr std::uint64_t kBusCallTimeoutMicroseconds = 10'000'000;
// At the start, for each of connecting and the name.
constexpr std::chrono::microseconds kPatienceAtStart = 1s;

std::uint64_t monotonicMicroseconds() {
  timespec now{};
  ::clock_gettime(CLOCK_MONOTONIC, &now);
  return static_cast<std::uint64_t>(now.tv_sec) * 1'000'000 +
         static_cast<std::uint64_t>(now.tv_nsec) / 1000;
}

// Zero, or a negative errno.
int waitUntilConnected(sd_bus* bus) {
  const auto end = std::chrono::steady_clock::now() + kPatienceAtStart;
  int r = 0;
  while ((r = sd_bus_is_ready(bus)) == 0) {
    const auto left = std::chrono::duration_cast<std::chrono::microseconds>(
        end - std::chrono::steady_clock::now());
    if (left.count() <= 0) return -ETIMEDOUT;
    r = sd_bus_process(bus, nullptr);
    if (r == 0) r = sd_bus_wait(bus, static_cast<std::uint64_t>(left.count()));
    if (r < 0) return r;
  }
  return std::min(r, 0);
}

}  // namespace

int openSessionBus(const std::string& address, BusPtr& out) {
  sd_bus* bus = nullptr;
  int r = 0;
  if (address.empty()) {
    r = sd_bus_open_user(&bus);
    out.reset(bus);
  } else {
    r = sd_bus_new(&bus);
    out.reset(bus);
    if (r >= 0) r = sd_bus_set_address(bus, address.c_str());
    if (r >= 0) r = sd_bus_set_bus_client(bus, 1);
    if (r >= 0) r = sd_bus_start(bus);
  }
  if (r < 0) return r;
  sd_bus_set_method_call_timeout(bus, kBusCallTimeoutMicroseconds);
  sd_bus_set_exit_on_disconnect(bus, 0);
  return 0;
}

BusName acquireBusName(const std::string& address, const std::string& name) {
  BusName result;
  int r = openSessionBus(address, result.bus);
  if (r >= 0) r = waitUntilConnected(result.bus.get());
  if (r >= 0) {
    sd_bus_set_method_call_timeout(result.bus.get(), kPatienceAtStart.count());
    r = sd_bus_request_name(result.bus.get(), name.c_str(), 0);
    sd_bus_set_method_call_timeout(result.bus.get(), kBusCallTimeoutMicroseconds);
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
                 OpenPrivate openPrivate, Events events)
    : context_(context),
      port_(std::make_shared<DelegatePort>(context, std::move(delegate))),
      openPrivate_(std::move(openPrivate)),
      events_(std::move(events)),
      unidentified_(std::make_shared<CallFlow>(context.options.processCallsUnderWay,
                                               context.options.clientMemory / 4, context.memory,
                                               kNoProcess)),
      dispatcher_(context, std::move(configuration), std::move(serviceInterface)),
      bus_(std::move(bus)) {}

BusDoor::~BusDoor() { close(); }

void BusDoor::start() {
  context_.loop.assertCurrent();
  sd_bus_slot* slot = nullptr;
  sd_bus_add_filter(bus_.get(), &slot, &BusDoor::_onMessage, this);
  filter_.reset(slot);
  waitsFor_ = EPOLLIN;
  watch_ = context_.loop.watch(sd_bus_get_fd(bus_.get()), waitsFor_, [this](std::uint32_t) {
    context_.loop.assertCurrent();
    _pump();
  });
  _pump();
}

void BusDoor::close() {
  context_.loop.assertCurrent();
  *self_ = nullptr;
  watch_.reset();
  timeout_.reset();
  callers_.clear();
  gone_.clear();
  nameRequest_.reset();
  filter_.reset();
  bus_.reset();
}

void BusDoor::requestName(const std::string& name, std::function<void(NameAnswer)> answered) {
  context_.loop.assertCurrent();
  nameAnswered_ = std::move(answered);
  sd_bus_slot* slot = nullptr;
  const int r = sd_bus_request_name_async(bus_.get(), &slot, name.c_str(), SD_BUS_NAME_QUEUE,
                                          &BusDoor::_onNameAnswer, this);
  nameRequest_.reset(slot);
  if (r < 0) return lose();
  _updateWaiting();
}

int BusDoor::_onNameAnswer(sd_bus_message* message, void* self, sd_bus_error*) {
  constexpr std::uint32_t kPrimaryOwner = 1;
  constexpr std::uint32_t kInQueue = 2;
  constexpr std::uint32_t kAlreadyOwner = 4;
  std::uint32_t code = 0;
  if (sd_bus_message_is_method_error(message, nullptr) <= 0) {
    sd_bus_message_read(message, "u", &code);
  }
  auto answer = NameAnswer::Failed;
  if (code == kPrimaryOwner || code == kAlreadyOwner) answer = NameAnswer::Owned;
  if (code == kInQueue) answer = NameAnswer::Queued;
  auto& door = *static_cast<BusDoor*>(self);
  door.context_.loop.assertCurrent();
  door.nameAnswered_(answer);
  return 1;
}

void BusDoor::_takeDriverSignal(sd_bus_message* signal) {
  const char* name = nullptr;
  if (sd_bus_message_is_signal(signal, "org.freedesktop.DBus", "NameAcquired") <= 0) return;
  if (sd_bus_message_read(signal, "s", &name) > 0) events_.nameAcquired(name);
  sd_bus_message_rewind(signal, 1);
}

int BusDoor::_onMessage(sd_bus_message* message, void* self, sd_bus_error*) {
  auto& door = *static_cast<BusDoor*>(self);
  door.context_.loop.assertCurrent();
  return door._take(message);
}

int BusDoor::_take(sd_bus_message* message) {
  std::uint8_t type = 0;
  sd_bus_message_get_type(message, &type);
  const char* interface = sd_bus_message_get_interface(message);
  const char* sender = sd_bus_message_get_sender(message);
  if (sender && std::strcmp(sender, "org.freedesktop.DBus") == 0) _takeDriverSignal(message);
  const bool isPeer = interface && std::strcmp(interface, "org.freedesktop.DBus.Peer") == 0;
  if (type != SD_BUS_MESSAGE_METHOD_CALL || isPeer) {
    const auto found = callers_.find(sender ? sender : "");
    if (found != callers_.end()) Dispatcher::noteMessage(*found->second);
    return 0;
  }
  if (!sender) return 1;
  if (callers_.size() >= context_.connections->mostBusCallers() && !callers_.contains(sender)) {
    context_.limits.refused("bus_callers", sender);
    sd_bus_reply_method_errorf(message, kLimitsExceeded.data(), "too many callers on the bus");
    return 1;
  }
  auto& caller = callers_[sender];
  if (!caller) {
    caller = std::make_unique<BusCaller>(*this, context_, bus_.get(), sender);
    caller->start();
  }
  caller->take(message);
  return 1;
}

void BusDoor::_pump() {
  if (!watch_) return;  // lost, and about to be destroyed
  for (int i = 0; i < kBusMessagesInARow; ++i) {
    const int r = sd_bus_process(bus_.get(), nullptr);
    if (r < 0) return lose();
    if (r == 0) return _updateWaiting();
  }
  _updateWaiting();
  if (std::exchange(pumpsSoon_, true)) return;
  context_.loop.soon([self = self_] {
    auto* door = *self;
    if (!door) return;
    door->context_.loop.assertCurrent();
    door->pumpsSoon_ = false;
    door->_pump();
  });
}

// Waits for what sd-bus waits for: its descriptor, and the end of a call to the driver.
void BusDoor::_updateWaiting() {
  if (!watch_) return;
  // poll's events are epoll's.
  const auto wanted = static_cast<std::uint32_t>(std::max(0, sd_bus_get_events(bus_.get())));
  if (std::exchange(waitsFor_, wanted) != wanted) {
    context_.loop.changeEvents(sd_bus_get_fd(bus_.get()), wanted);
  }
  std::uint64_t due = UINT64_MAX;
  if (sd_bus_get_timeout(bus_.get(), &due) < 0 || due == UINT64_MAX) return timeout_.reset();
  const auto now = monotonicMicroseconds();
  timeout_ = context_.loop.after(std::chrono::microseconds(due > now ? due - now : 0), [this] {
    context_.loop.assertCurrent();
    _pump();
  });
}

void BusDoor::send(MessagePtr message, std::size_t bytes) {
  context_.loop.assertCurrent();
  if (!_hasRoomToSend()) return context_.limits.refused("bus_messages", "the session bus");
  const int r = sd_bus_send(bus_.get(), message.get(), nullptr);
  if (r < 0) context_.log.error("message not sent on the bus: {}", std::strerror(-r));
  queued_.push_back(bytes);
  queuedBytes_ += bytes;
  if (!pumpsSoon_) _updateWaiting();
}

// What sd-bus sends by itself is small and not counted.
bool BusDoor::_hasRoomToSend() {
  std::uint64_t writes = 0;
  sd_bus_get_n_queued_write(bus_.get(), &writes);
  for (; queued_.size() > writes; queued_.pop_front()) queuedBytes_ -= queued_.front();
  return queued_.size() < kMostBusMessagesQueued && queuedBytes_ < kMostBusBytesQueued;
}

void BusDoor::signal(const std::string& destination, const std::string& interface,
                     const std::string& member, std::optional<std::string> text) {
  context_.loop.assertCurrent();
  sd_bus_message* message = nullptr;
  if (!bus_ || sd_bus_message_new_signal(bus_.get(), &message, kObjectPath.data(),
                                         interface.c_str(), member.c_str()) < 0) {
    return;
  }
  MessagePtr owned(message);
  if (!destination.empty()) sd_bus_message_set_destination(message, destination.c_str());
  if (text) sd_bus_message_append_basic(message, 's', wireText(*text).c_str());
  send(std::move(owned), 256);
}

void BusDoor::vanished(const std::string& name) {
  context_.loop.assertCurrent();
  const auto found = callers_.find(name);
  if (found == callers_.end()) return;
  found->second->end();
  gone_.push_back(std::move(found->second));
  callers_.erase(found);
  context_.loop.soon([self = self_] {
    auto* door = *self;
    if (!door) return;
    door->context_.loop.assertCurrent();
    door->gone_.clear();
  });
}

void BusDoor::lose() {
  context_.loop.assertCurrent();
  if (!watch_) return;
  watch_.reset();
  timeout_.reset();
  for (const auto& [name, caller] : callers_) caller->end();
  events_.lost();
}

}  // namespace zelkord::ipc
