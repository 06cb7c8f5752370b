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
  static_cast<BusCaller*>(self)->_identified(message);
  return 1;
}

void BusCaller::_identified(sd_bus_message* answer) {
  if (sd_bus_message_is_method_error(answer, nullptr) > 0) return door_.vanished(name_);
  auto outcome = decodeArguments(answer, "a{sv}", {});
  const auto* decoded = std::get_if<Decoded>(&outcome);
  if (!decoded) return door_.vanished(name_);
  const auto& credentials = *decoded->values.at(0).get<Dictionary>();
  const auto number = [&](const char* key) {
    const auto found = credentials.find(key);
    return found == credentials.end() ? nullptr : found->second.get<std::uint32_t>();
  };
  const auto* uid = number("UnixUserID");
  const auto* pid = number("ProcessID");
  state_ = uid && *uid == ::geteuid() ? State::Known : State::Refused;
  if (uid && pid) peer_ = {static_cast<pid_t>(*pid), *uid};
  for (auto& message : std::exchange(waiting_, {})) take(message.get());
}

void BusCaller::take(sd_bus_message* message) {
  switch (state_) {
    case State::Checking:
      if (waiting_.size() < context_.options.callsUnderWay) {
        waiting_.emplace_back(sd_bus_message_ref(message));
      } else {
        door_.dispatcher().refuse(*plain_, originOf(message), kLimitsExceeded, "too many calls");
      }
      return;
    case State::Known:
      return door_.dispatcher().dispatch(message, *this);
    case State::Refused:
      return door_.dispatcher().refuse(*plain_, originOf(message), kAccessDenied,
                                       "another user is served here");
  }
}

std::shared_ptr<ServedConnection> BusCaller::receiver(const std::string& interface) {
  const auto& configuration = door_.dispatcher().configuration();
  if (connection_.connection) return connection_.connection;
  if (interface == configuration.connectionInterface) {
    connection_ = _makeSession();
    ++context_.counts->connections;
    door_.port().announce(connection_.connection);
    return connection_.connection;
  }
  if (!shared_.connection && configuration.sharedHandler) {
    shared_ = _makeSession();
    shared_.connection->setHandler(configuration.sharedHandler);
    shared_.connection->open();
  }
  return shared_.connection;
}

BusCaller::Session BusCaller::_makeSession() {
  auto outlet = std::make_shared<BusOutlet>(
      bus_, name_,
      [this](MessagePtr message, std::size_t bytes) { door_.send(std::move(message), bytes); },
      [this] { _invalidateConnection(); });
  auto connection = std::make_shared<ServedConnection>(context_, peer_, outlet);
  return {std::move(outlet), std::move(connection)};
}

void BusCaller::_invalidateConnection() {
  if (!connection_.connection) return;
  _endConnection();
  door_.signal(name_, door_.dispatcher().configuration().connectionInterface, "Invalidated", {});
}

void BusCaller::_endConnection() {
  const auto session = std::exchange(connection_, {});
  if (!session.connection) return;
  session.outlet->end();
  session.connection->end();
  --context_.counts->connections;
}

void BusCaller::end() {
  _endConnection();
  plain_->end();
  if (const auto session = std::exchange(shared_, {}); session.connection) {
    session.outlet->end();
    session.connection->end();
  }
}

FileHandle BusCaller::openPrivateConnection() { return door_.openPrivateConnection(peer_); }

// The bus lets no malformed message through; if one comes all the same, it is dropped.
void BusCaller::cutOff(const std::string& reason) {
  context_.log.error("message of {} dropped: {}", name_, reason);
}

}  // namespace zelkord::ipc
