#include "platform/linux/ipc/BusPresence.h"

#include <algorithm>
#include <charconv>
#include <cstdlib>
#include <utility>

#include "platform/linux/watch/PathWatcher.h"

namespace zelkord::ipc {
namespace {

constexpr Duration kFirstRejoinDelay = 100ms;
constexpr Duration kLongestRejoinDelay = 60s;

std::string environmentVariable(const char* name) {
  const char* value = std::getenv(name);
  return value ? value : "";
}

// Where the session's own bus is looked for.
std::string sessionBusSocket(const std::string& configured) {
  if (!configured.empty()) return socketPathOf(configured);
  const auto address = environmentVariable("DBUS_SESSION_BUS_ADDRESS");
  if (!address.empty()) return socketPathOf(address);
  const auto runtime = environmentVariable("XDG_RUNTIME_DIR");
  return runtime.empty() ? "" : runtime + "/bus";
}

}  // namespace

Duration rejoinDelay(int attempts) {
  constexpr int kDoublings = 10;
  return std::min<Duration>(kFirstRejoinDelay * (1 << std::min(attempts, kDoublings)),
                            kLongestRejoinDelay);
}

std::string socketPathOf(const std::string& address) {
  constexpr std::string_view kPrefix = "unix:path=";
  if (!address.starts_with(kPrefix)) return {};
  const auto escaped = address.substr(kPrefix.size(), address.find_first_of(",;") - kPrefix.size());
  std::string path;
  for (std::size_t at = 0; at < escaped.size(); ++at) {
    char byte = escaped[at];
    if (byte == '%' && at + 2 < escaped.size()) {
      const char* digits = escaped.data() + at + 1;
      unsigned value = 0;
      std::from_chars(digits, digits + 2, value, 16);
      byte = static_cast<char>(value);
      at += 2;
    }
    path += byte;
  }
  return path;
}

BusPresence::BusPresence(IpcContext& context, std::string name, MakeDoor makeDoor)
    : context_(context), name_(std::move(name)), makeDoor_(std::move(makeDoor)) {}

BusPresence::~BusPresence() { close(); }

void BusPresence::begin(BusPtr bus) {
  context_.loop.assertCurrent();
  if (!bus) return _waitForTheBus();
  state_ = State::Present;
  _openDoor(std::move(bus));
}

void BusPresence::close() {
  context_.loop.assertCurrent();
  *self_ = nullptr;
  watch_.reset();
  nextAttempt_.reset();
  if (door_) door_->close();
  door_.reset();
}

BusDoor* BusPresence::door() {
  context_.loop.assertCurrent();
  return state_ == State::Present ? door_.get() : nullptr;
}

void BusPresence::_openDoor(BusPtr bus) {
  door_ = makeDoor_(std::move(bus), {.lost =
                                         [this] {
                                           context_.loop.assertCurrent();
                                           _lost();
                                         },
                                     .nameAcquired =
                                         [this](const std::string& name) {
                                           context_.loop.assertCurrent();
                                           _nameAcquired(name);
                                         }});
  door_->start();
}

void BusPresence::_lost() {
  if (std::exchange(state_, State::Absent) != State::Joining) {
    context_.log.error("the session bus is gone; the private socket is still served");
  }
  // The door is on the stack.
  context_.loop.soon([self = self_] {
    auto* presence = *self;
    if (!presence) return;
    presence->context_.loop.assertCurrent();
    presence->door_.reset();
    presence->_waitForTheBus();
  });
}

// While the place of the bus's socket can be watched, nothing polls for long.
void BusPresence::_waitForTheBus() {
  state_ = State::Absent;
  const auto path = sessionBusSocket(context_.options.sessionBusAddress);
  if (!watch_ && context_.options.watcher && !path.empty()) {
    watch_ = context_.options.watcher->watch(path, [self = self_, inbox = context_.loop.inbox()] {
      inbox->post([self] {
        auto* presence = *self;
        if (!presence) return;
        presence->context_.loop.assertCurrent();
        presence->_mayBeThere();
      });
    });
  }
  const auto delay = rejoinDelay(attempts_++);
  if (watch_ && delay >= kLongestRejoinDelay) return;
  nextAttempt_ = context_.loop.after(delay, [this] {
    context_.loop.assertCurrent();
    _join();
  });
}

void BusPresence::_mayBeThere() {
  attempts_ = 0;
  if (state_ == State::Absent && !door_) _waitForTheBus();
}

void BusPresence::_join() {
  BusPtr bus;
  if (openSessionBus(context_.options.sessionBusAddress, bus) < 0) return _waitForTheBus();
  state_ = State::Joining;
  _openDoor(std::move(bus));
  if (state_ == State::Joining) {
    door_->requestName(name_, [this](BusDoor::NameAnswer answer) {
      context_.loop.assertCurrent();
      _nameAnswered(answer);
    });
  }
}

void BusPresence::_nameAnswered(BusDoor::NameAnswer answer) {
  if (state_ != State::Joining) return;
  if (answer == BusDoor::NameAnswer::Owned) return _becomePresent();
  if (answer == BusDoor::NameAnswer::Failed) return door_->lose();
  state_ = State::Queued;
  context_.log.error("the name {} is taken on the session bus; it is served when it is free",
                     name_);
}

void BusPresence::_nameAcquired(const std::string& name) {
  if (state_ == State::Queued && name == name_) _becomePresent();
}

void BusPresence::_becomePresent() {
  state_ = State::Present;
  attempts_ = 0;
  watch_.reset();
  context_.log.notice("the name {} is served on the session bus", name_);
}

}  // namespace zelkord::ipc
