#include "corezelkor/client/internal/ClientCore.h"

#include <algorithm>
#include <memory>

#include "corezelkor/Constants.h"
#include "corezelkor/client/internal/Wire.h"

namespace zelkor {
namespace {

ClientOptions checked(ClientOptions options) {
  constexpr Duration kLongest = 24h * 365;  // far from the clock's end
  options.timeout = std::clamp(options.timeout, Duration::zero(), kLongest);
  return options;
}

}  // namespace

ClientCore::ClientCore(ClientOptions options)
    : options_(checked(std::move(options))),
      loop_([this] { return _turn(); }),
      opener_(options_),
      bagListener_(options_.bagDidLoad),
      main_(loop_, {.open =
                        [this](Door::Opened opened) {
                          loop_.assertCurrent();
                          opener_.open(std::move(opened));
                        },
                    .didOpen = [this](BusConnection& connection) { _didOpen(connection); },
                    .didFail =
                        [this](const Error& error) {
                          loop_.assertCurrent();
                          _tellAddress(error);
                        },
                    .didClose =
                        [this] {
                          loop_.assertCurrent();
                          endpointAddress_.clear();
                          if (options_.disconnected) options_.disconnected();
                        }}),
      endpoint_(loop_, {.open = [this](const Door::Opened& opened) { _openEndpoint(opened); },
                        .didOpen = [](BusConnection&) {},
                        .didFail = [](const Error&) {},
                        .didClose = [] {}}) {
  loop_.start();
}

ClientCore::~ClientCore() {
  loop_.finish([this] {
    loop_.assertCurrent();
    const auto cancelled = clientError(ClientErrorCode::Cancelled, "the client is gone");
    opener_.stop();
    bagListener_.stop();
    endpoint_.close(cancelled);
    main_.close(cancelled);
  });
}

LoopWait ClientCore::_turn() {
  loop_.assertCurrent();
  LoopWait wait;
  opener_.turn(wait);
  main_.turn(wait);
  endpoint_.turn(wait);
  return wait;
}

ClientTime ClientCore::_deadline() const {
  return std::chrono::steady_clock::now() + options_.timeout;
}

void ClientCore::call(const Target& target, Encode encode, DoorCall::Completion completion) {
  const auto place = target.place;
  auto call =
      std::make_shared<DoorCall>(DoorCall{std::string(target.interface), std::string(target.member),
                                          std::move(encode), std::move(completion), _deadline()});
  loop_.post([this, place, call] {
    loop_.assertCurrent();
    (place == Place::Main ? main_ : endpoint_).call(std::move(*call));
  });
}

void ClientCore::_didOpen(BusConnection& connection) {
  loop_.assertCurrent();
  bagListener_.listenOn(connection);
  if (!options_.configuration.identifier.empty()) _configure();
}

void ClientCore::_configure() {
  configuring_ = true;
  main_.call({std::string(kDaemonInterface), "Configure",
              [this](MessageWriter& writer) { writeConfiguration(writer, options_.configuration); },
              [this](MessageReader* reader, const std::optional<Error>& error) {
                auto address = reader ? reader->text() : std::string();
                _didConfigure(std::move(address), error);
              },
              _deadline()});
}

void ClientCore::_didConfigure(std::string address, std::optional<Error> error) {
  loop_.assertCurrent();
  configuring_ = false;
  endpointAddress_ = std::move(address);
  if (!error && endpointAddress_.empty()) {
    error = clientError(ClientErrorCode::BadReply, "the daemon named no endpoint");
  }
  _tellAddress(error);
}

void ClientCore::_tellAddress(const std::optional<Error>& error) {
  std::vector<AddressReceiver> receivers;
  receivers.swap(addressReceivers_);
  for (const auto& receiver : receivers) receiver(endpointAddress_, error);
}

void ClientCore::_withEndpointAddress(AddressReceiver receiver) {
  addressReceivers_.push_back(std::move(receiver));
  if (options_.configuration.identifier.empty()) {
    _tellAddress(clientError(ClientErrorCode::Refused, "the client has no identifier"));
  } else if (!main_.isOpen()) {
    main_.open();
  } else if (!endpointAddress_.empty()) {
    _tellAddress(std::nullopt);
  } else if (!configuring_) {
    _configure();
  }
}

void ClientCore::_openEndpoint(const Door::Opened& opened) {
  loop_.assertCurrent();
  _withEndpointAddress([opened](const std::string& address, const std::optional<Error>& error) {
    if (error) return opened(nullptr, error);
    std::string why;
    auto connection = BusConnection::toPeer(address, why);
    if (connection) return opened(std::move(connection), std::nullopt);
    opened(nullptr, clientError(ClientErrorCode::NotReachable, "endpoint: " + why));
  });
}

}  // namespace zelkor
