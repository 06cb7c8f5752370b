#include "corezelkor/client/internal/ServiceOpener.h"

#include <fcntl.h>

#include <cerrno>
#include <cstring>
#include <utility>

#include "corezelkor/Constants.h"
#include "corezelkor/client/ClientError.h"
#include "corezelkor/client/internal/SocketAddress.h"

namespace zelkor {

void ServiceOpener::open(Door::Opened opened) {
  opened_ = std::move(opened);
  tried_.clear();
  if (!options_.address.empty()) return _connectTo(options_.address);
  if (!options_.socketPath.empty()) return _connectTo(addressOfSocket(options_.socketPath));
  _ask();
}

void ServiceOpener::_ask() {
  std::string why;
  bus_ = BusConnection::toBus(options_.busAddress, why);
  if (!bus_) return _fallBack("no bus (" + why + ")");
  deadline_ = std::chrono::steady_clock::now() + options_.timeout;
  _sendOpen();
}

void ServiceOpener::_sendOpen() {
  sd_bus_message* raw = nullptr;
  const int result = sd_bus_message_new_method_call(
      bus_->bus(), &raw, std::string(kServiceName).c_str(), std::string(kObjectPath).c_str(),
      "com.quenta.zelkord.Service1", "Open");
  const MessagePointer message(raw);
  if (result >= 0) {
    asking_ = bus_->call(raw, [this](sd_bus_message* reply, const std::optional<Error>& error) {
      _didAnswer(reply, error);
    });
  }
  if (!asking_) _fallBack("the bus takes no call");
}

void ServiceOpener::_didAnswer(sd_bus_message* reply, const std::optional<Error>& error) {
  if (error) return _fallBack("the bus says " + error->reason().value_or("no"));
  int borrowed = -1;
  if (sd_bus_message_read_basic(reply, 'h', &borrowed) <= 0) {
    return _fallBack("the bus gave no connection");
  }
  _connectToDescriptor(::fcntl(borrowed, F_DUPFD_CLOEXEC, 3));
}

void ServiceOpener::_connectToDescriptor(int descriptor) {
  if (descriptor < 0) return _finish(nullptr, std::strerror(errno));
  std::string why;
  auto connection = BusConnection::toPeer(descriptor, why);
  _finish(std::move(connection), why);
}

void ServiceOpener::_connectTo(const std::string& address) {
  std::string why;
  auto connection = BusConnection::toPeer(address, why);
  _finish(std::move(connection), address + " (" + why + ")");
}

void ServiceOpener::_fallBack(const std::string& why) {
  tried_ = why;
  for (const auto& path : defaultSocketPaths()) {
    const auto address = addressOfSocket(path);
    std::string problem;
    auto connection = BusConnection::toPeer(address, problem);
    if (connection) return _finish(std::move(connection), "");
    tried_ += "; " + address + " (" + problem + ")";
  }
  _finish(nullptr, "");
}

void ServiceOpener::_finish(std::unique_ptr<BusConnection> connection, const std::string& why) {
  const auto opened = std::exchange(opened_, nullptr);
  asking_.reset();
  if (connection) return opened(std::move(connection), std::nullopt);
  opened(nullptr, clientError(ClientErrorCode::NotReachable, tried_ + why));
}

void ServiceOpener::stop() {
  opened_ = nullptr;
  asking_.reset();
  bus_.reset();
}

void ServiceOpener::turn(LoopWait& wait) {
  if (!bus_) return;
  const bool open = bus_->process();
  if (opened_ && !open) _fallBack("the bus closed the connection");
  if (opened_ && deadline_ <= std::chrono::steady_clock::now()) {
    _finish(nullptr, "no answer from the bus in time");
  }
  if (!opened_) {
    // Only here, outside of its call-backs.
    bus_.reset();
    return;
  }
  wait.until(deadline_);
  bus_->addTo(wait);
}

}  // namespace zelkor
