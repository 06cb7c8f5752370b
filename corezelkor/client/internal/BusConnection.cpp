#include "corezelkor/client/internal/BusConnection.h"

#include <unistd.h>

#include <array>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <string_view>
#include <thread>
#include <utility>

#include "corezelkor/client/ClientError.h"
#include "corezelkor/client/internal/SocketAddress.h"

namespace zelkor {
namespace {

// A connection with much to read lets the others have their turn.
constexpr int kMaximumRounds = 256;

// A daemon to whom very many come at once turns some away for a moment (EAGAIN).
constexpr std::chrono::seconds kPatienceToConnect{1};
constexpr std::chrono::milliseconds kBetweenAttempts{10};

int handleBusReply(sd_bus_message* reply, void* userdata, sd_bus_error*) {
  // Moved out: the handler may destroy the call.
  const auto handler = std::move(static_cast<BusCall*>(userdata)->handler);
  const auto* error = sd_bus_message_get_error(reply);
  if (error) {
    handler(reply, errorOfReply(*error));
  } else {
    handler(reply, std::nullopt);
  }
  return 1;
}

// Takes a fresh sd_bus, prepares it with `prepare`, starts it. Null, and a negative errno, when
// that fails.
template <typename Prepare>
std::unique_ptr<BusConnection> startedConnection(const Prepare& prepare, int& problem) {
  sd_bus* raw = nullptr;
  int result = sd_bus_new(&raw);
  BusPointer bus(raw);
  if (result >= 0) result = prepare(raw);
  if (result >= 0) result = sd_bus_start(raw);
  if (result >= 0) return std::make_unique<BusConnection>(std::move(bus));
  problem = result;
  return nullptr;
}

// The same, again and again while there is no place.
template <typename Prepare>
std::unique_ptr<BusConnection> patientConnection(const Prepare& prepare, std::string& why) {
  const auto end = std::chrono::steady_clock::now() + kPatienceToConnect;
  for (;;) {
    int problem = 0;
    auto connection = startedConnection(prepare, problem);
    if (connection) return connection;
    why = std::strerror(-problem);
    if (problem != -EAGAIN || std::chrono::steady_clock::now() >= end) return nullptr;
    std::this_thread::sleep_for(kBetweenAttempts);
  }
}

// Nothing but the sign-on has gone out yet. Null unless the daemon's user is ours.
std::unique_ptr<BusConnection> withOwnPeer(std::unique_ptr<BusConnection> connection,
                                           std::string& why) {
  if (!connection) return nullptr;
  auto problem = problemWithPeer(sd_bus_get_fd(connection->bus()));
  if (problem.empty()) return connection;
  why = std::move(problem);
  return nullptr;
}

}  // namespace

Error errorOfReply(const sd_bus_error& error) {
  static constexpr std::array<std::pair<std::string_view, ClientErrorCode>, 7> kCodes{{
      // Time limits are the client's own, so no reply means that nobody is left to send it.
      {SD_BUS_ERROR_NO_REPLY, ClientErrorCode::Disconnected},
      {SD_BUS_ERROR_DISCONNECTED, ClientErrorCode::Disconnected},
      {SD_BUS_ERROR_SERVICE_UNKNOWN, ClientErrorCode::NotReachable},
      {SD_BUS_ERROR_NAME_HAS_NO_OWNER, ClientErrorCode::NotReachable},
      {SD_BUS_ERROR_TIMEOUT, ClientErrorCode::TimedOut},
      {"org.freedesktop.DBus.Error.TimedOut", ClientErrorCode::TimedOut},
      {"org.freedesktop.DBus.Error.Spawn.ExecFailed", ClientErrorCode::NotReachable},
  }};
  const std::string_view name = error.name ? error.name : "";
  auto code = ClientErrorCode::Refused;
  for (const auto& [known, meaning] : kCodes) {
    if (known == name) code = meaning;
  }
  return clientError(code, std::string(name) + ": " + (error.message ? error.message : ""));
}

std::unique_ptr<BusConnection> BusConnection::toPeer(const std::string& address, std::string& why) {
  return withOwnPeer(
      patientConnection([&](sd_bus* bus) { return sd_bus_set_address(bus, address.c_str()); }, why),
      why);
}

std::unique_ptr<BusConnection> BusConnection::toPeer(int ownedDescriptor, std::string& why) {
  bool taken = false;
  int problem = 0;
  auto connection = startedConnection(
      [&](sd_bus* bus) {
        const int result = sd_bus_set_fd(bus, ownedDescriptor, ownedDescriptor);
        taken = result >= 0;
        return result;
      },
      problem);
  if (!connection) why = std::strerror(-problem);
  if (!taken) ::close(ownedDescriptor);
  return withOwnPeer(std::move(connection), why);
}

std::unique_ptr<BusConnection> BusConnection::toBus(const std::string& address, std::string& why) {
  if (!address.empty()) {
    return patientConnection(
        [&](sd_bus* bus) {
          const int result = sd_bus_set_address(bus, address.c_str());
          return result < 0 ? result : sd_bus_set_bus_client(bus, 1);
        },
        why);
  }
  sd_bus* raw = nullptr;
  const int result = sd_bus_open_user(&raw);
  if (result >= 0) return std::make_unique<BusConnection>(BusPointer(raw));
  why = std::strerror(-result);
  return nullptr;
}

std::unique_ptr<BusCall> BusConnection::call(sd_bus_message* message, BusCall::Handler handler) {
  auto call = std::make_unique<BusCall>();
  call->handler = std::move(handler);
  sd_bus_slot* slot = nullptr;
  const int result =
      sd_bus_call_async(bus_.get(), &slot, message, &handleBusReply, call.get(), UINT64_MAX);
  call->slot.reset(slot);
  return result < 0 ? nullptr : std::move(call);
}

bool BusConnection::process() {
  int result = 1;
  for (int round = 0; result > 0 && round < kMaximumRounds; ++round) {
    result = sd_bus_process(bus_.get(), nullptr);
  }
  moreToDo_ = result > 0;
  return result >= 0;
}

void BusConnection::addTo(LoopWait& wait) const {
  const int descriptor = sd_bus_get_fd(bus_.get());
  const int events = sd_bus_get_events(bus_.get());
  std::uint64_t microseconds = 0;
  const int timeout = sd_bus_get_timeout(bus_.get(), &microseconds);
  if (moreToDo_ || descriptor < 0 || events < 0 || timeout < 0) {
    wait.until(ClientTime{});
    return;
  }
  wait.descriptors.push_back({descriptor, static_cast<short>(events), 0});
  // Of the monotonic clock, like steady_clock's.
  if (timeout > 0 && microseconds != UINT64_MAX) {
    wait.until(ClientTime(std::chrono::microseconds(microseconds)));
  }
}

}  // namespace zelkor
