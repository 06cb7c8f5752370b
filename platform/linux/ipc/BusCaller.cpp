#include "platform/linux/ipc/BusCaller.h"

#include <utility>

#include "platform/linux/ipc/BusDoor.h"
#include "platform/linux/ipc/Introspection.h"

namespace zelkord::ipc {
namespace {

constexpr const char* kDriver = "org.freedesktop.DBus";
constexpr std::string_view kAccessDenied = "org.freedesktop.DBus.Error.AccessDenied";

}  // namespace

BusCaller::BusCaller(BusDoor& door, IpcContext& context, sd_bus* bus, std::string name)
    : door_(door),
      context_(context),
      bus_(bus),
      name_(std::move(name)),
      plain_(std::make_shared<BusOutlet>(
          bus_, name_,
          [this](MessagePtr message, std::size_t bytes) { door_.send(std::move(message), bytes); },
          [] {})) {}

BusCaller::~BusCaller() { end(); }

void BusCaller::start() {
  context_.loop.assertCurrent();
  sd_bus_slot* slot = nullptr;
  const auto rule =
      "type='signal',sender='org.freedesktop.DBus',interface='org.freedesktop.DBus',"
      "member='NameOwnerChanged',arg0='" +
      name_ + "'";
  sd_bus_add_match_async(bus_, &slot, rule.c_str(), &BusCaller::_onOwnerChanged,
                         &BusCaller::_onMatched, this);
  match_.reset(slot);
  // Asked after the rule: a name that vanishes is either unknown here, or announced.
  slot = nullptr;
  sd_bus_call_method_async(bus_, &slot, kDriver, "/org/freedesktop/DBus", kDriver,
                           "GetConnectionCredentials", &BusCaller::_onCredentials, this, "s",
                           name_.c_str());
  query_.reset(slot);
}

int BusCaller::_onMatched(sd_bus_message*, void*, sd_bus_error*) { return 1; }

int BusCaller::_onOwnerChanged(sd_bus_message* message, void* self, sd_bus_error*) {
  auto& caller = *static_cast<BusCaller*>(self);
  const char* name = nullptr;
  const char* before = nullptr;
  const char* now = nullptr;
  if (sd_bus_message_read(message, "sss", &name, &before, &now) >= 0 && *now == '\0') {
    caller.door_.vanished(caller.name_);
  }
  return 1;
}

int BusCaller::_onCredentials(sd_bus_message* message, void* self, sd_bus_error*) {
  auto& caller = *static_cast<BusCaller*>(self);
  caller.context_.loop.assertCurrent();
  caller._identified(message);
  return 1;
}

void BusCaller::_identified(sd_bus_message* answer) {
  if (sd_bus_message_is_method_error(answer, nullptr) > 0) return door_.vanished(name_);
  auto outcome = decodeArguments(answer, "a{sv}", {});
  const auto* decoded = std::get_if<Decoded>(&outcome);
  if (!decoded) return door_.vanished(name_);
  const auto& credentials = *decoded->values.at(0).get<Dictionary>();
  const auto number = [&](const char* key) -> std::optional<std::uint32_t> {
    const auto found = credentials.find(key);
    const auto* value = found == credentials.end() ? nullptr : found->second.get<std::uint32_t>();
    return value ? std::optional(*value) : std::nullopt;
  };
  const auto refusal = _admit(number("UnixUserID"), number("ProcessID"));
  state_ = refusal ? State::Refused : State::Known;
  if (refusal) refusal_ = *refusal;
  for (auto& waiting : std::exchange(waiting_, {})) _serve(std::move(waiting.call));
  // Its next call is a new attempt.
  if (refusal && refusal->error == kLimitsExceeded) door_.vanished(name_);
}

std::optional<BusCaller::Refusal> BusCaller::_admit(std::optional<std::uint32_t> uid,
                                                    std::optional<std::uint32_t> pid) {
  if (uid != ::geteuid()) return Refusal{kAccessDenied, "another user is served here"};
  if (pid) peer_ = {static_cast<pid_t>(*pid), *uid};
  auto share = context_.connections->takeBusCaller(peer_.pid);
  if (!share) return Refusal{kLimitsExceeded, "too many callers on the bus"};
  share_ = *std::move(share);
  return std::nullopt;
}

void BusCaller::take(sd_bus_message* message) {
  context_.loop.assertCurrent();
  auto call = door_.dispatcher().take(message);
  state_ == State::Checking ? _wait(std::move(call)) : _serve(std::move(call));
}

void BusCaller::_wait(TakenCall call) {
  const auto origin = call.origin;
  auto share = door_.unidentified().take(call.bytes());
  if (!share || waiting_.size() >= context_.options.callsUnderWay) {
    return door_.dispatcher().refuse(*plain_, origin, kLimitsExceeded, "too many calls");
  }
  waiting_.push_back({std::move(call), *std::move(share)});
}

void BusCaller::_serve(TakenCall call) {
  if (state_ == State::Known) return door_.dispatcher().dispatch(std::move(call), *this);
  door_.dispatcher().refuse(*plain_, call.origin, refusal_.error, refusal_.text);
}

Receiver BusCaller::receiver(const std::string& interface) {
  context_.loop.assertCurrent();
  const auto& configuration = door_.dispatcher().configuration();
  if (connection_.connection) return {connection_.connection, {}};
  if (interface == configuration.connectionInterface) return _beginConnection();
  if (!shared_.connection && configuration.sharedHandler) {
    shared_ = _makeSession();
    shared_.connection->setHandler(configuration.sharedHandler);
    shared_.connection->open();
  }
  return {shared_.connection, kUnknownInterface};
}

Receiver BusCaller::_beginConnection() {
  auto share = context_.connections->take(peer_.pid);
  if (!share) return {nullptr, kLimitsExceeded};
  connection_ = _makeSession();
  connection_.share = *std::move(share);
  connection_.holding = context_.memory->add(*this);
  connection_.open = context_.connections->holdOpen(peer_.pid, [this] { cutOffForMemory(); });
  ++context_.counts->connections;
  door_.port().announce(connection_.connection);
  return {connection_.connection, {}};
}

BusCaller::Session BusCaller::_makeSession() {
  auto outlet = std::make_shared<BusOutlet>(
      bus_, name_,
      [this](MessagePtr message, std::size_t bytes) { door_.send(std::move(message), bytes); },
      [this] { cutOffForMemory(); });
  auto connection = std::make_shared<ServedConnection>(context_, peer_, outlet);
  return {std::move(outlet), std::move(connection), {}, {}, {}};
}

ServedConnection* BusCaller::connection() {
  context_.loop.assertCurrent();
  return connection_.connection.get();
}

const std::shared_ptr<CallFlow>& BusCaller::calls() const {
  context_.loop.assertCurrent();
  return connection_.connection->flow();
}

void BusCaller::cutOffForMemory() {
  context_.loop.assertCurrent();
  _invalidateConnection();
}

void BusCaller::_invalidateConnection() {
  if (!connection_.connection) return;
  _endConnection();
  door_.signal(name_, door_.dispatcher().configuration().connectionInterface, "Invalidated", {});
}

void BusCaller::_endConnection() {
  if (!connection_.connection) return;
  connection_.holding.reset();
  const auto session = std::exchange(connection_, {});
  session.outlet->end();
  session.connection->end();
  --context_.counts->connections;
}

void BusCaller::end() {
  context_.loop.assertCurrent();
  _endConnection();
  plain_->end();
  if (const auto session = std::exchange(shared_, {}); session.connection) {
    session.outlet->end();
    session.connection->end();
  }
}

FileHandle BusCaller::openPrivateConnection() {
  context_.loop.assertCurrent();
  return door_.openPrivateConnection(peer_);
}

// Its connection to the bus is not ours to close.
void BusCaller::cutOff(const std::string& reason) {
  context_.log.error("message of {} dropped: {}", name_, reason);
}

}  // namespace zelkord::ipc
