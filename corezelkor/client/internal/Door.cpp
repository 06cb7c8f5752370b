#include "corezelkor/client/internal/Door.h"

#include <cstring>
#include <utility>

#include "corezelkor/Constants.h"
#include "corezelkor/client/ClientError.h"

namespace zelkor {

Door::Door(const ClientLoop& loop, Behaviour behaviour)
    : loop_(loop), behaviour_(std::move(behaviour)) {}

Door::~Door() = default;

bool Door::isOpen() const {
  loop_.assertCurrent();
  return state_ == State::Open;
}

void Door::call(DoorCall call) {
  loop_.assertCurrent();
  calls_.push_back({std::move(call), nullptr});
  const auto pending = std::prev(calls_.end());
  if (state_ == State::Open) _send(pending);
  if (state_ == State::Closed) open();
}

void Door::open() {
  loop_.assertCurrent();
  if (state_ != State::Closed) return;
  state_ = State::Opening;
  behaviour_.open([this](std::unique_ptr<BusConnection> connection, std::optional<Error> error) {
    _didOpen(std::move(connection), std::move(error));
  });
}

void Door::_didOpen(std::unique_ptr<BusConnection> connection, std::optional<Error> error) {
  loop_.assertCurrent();
  if (!connection) {
    state_ = State::Closed;
    const auto failure = error.value_or(clientError(ClientErrorCode::NotReachable, ""));
    _failAll(failure);
    behaviour_.didFail(failure);
    return;
  }
  connection_ = std::move(connection);
  state_ = State::Open;
  Calls waiting;
  waiting.swap(calls_);
  behaviour_.didOpen(*connection_);
  while (!waiting.empty()) {
    calls_.splice(calls_.end(), waiting, waiting.begin());
    _send(std::prev(calls_.end()));
  }
}

void Door::_send(Calls::iterator pending) {
  if (auto error = _transmit(pending)) _complete(pending, nullptr, std::move(error));
}

std::optional<Error> Door::_transmit(Calls::iterator pending) {
  auto& call = pending->call;
  sd_bus_message* raw = nullptr;
  int result = sd_bus_message_new_method_call(connection_->bus(), &raw, nullptr,
                                              std::string(kObjectPath).c_str(),
                                              call.interface.c_str(), call.member.c_str());
  const MessagePointer message(raw);
  if (result >= 0) {
    MessageWriter writer(raw);
    call.encode(writer);
    result = writer.status();
  }
  if (result == -EINVAL || result == -EMSGSIZE) {
    return clientError(ClientErrorCode::Refused, "an argument is not UTF-8, or too large");
  }
  if (result < 0) return clientError(ClientErrorCode::Disconnected, std::strerror(-result));
  pending->sent =
      connection_->call(raw, [this, pending](sd_bus_message* reply, std::optional<Error> error) {
        _complete(pending, reply, std::move(error));
      });
  if (pending->sent) return std::nullopt;
  return clientError(ClientErrorCode::Disconnected, "the message could not be sent");
}

void Door::_complete(Calls::iterator pending, sd_bus_message* reply, std::optional<Error> error) {
  loop_.assertCurrent();
  const auto finished = std::move(*pending);
  calls_.erase(pending);
  MessageReader reader(reply);
  finished.call.completion(error ? nullptr : &reader, std::move(error));
}

void Door::turn(LoopWait& wait) {
  loop_.assertCurrent();
  if (connection_ && !connection_->process()) {
    state_ = State::Closed;
    const auto ended = std::move(connection_);
    _failAll(clientError(ClientErrorCode::Disconnected, "the daemon closed the connection"));
    behaviour_.didClose();
  }
  _expire();
  if (connection_) connection_->addTo(wait);
  for (const auto& pending : calls_) wait.until(pending.call.deadline);
}

void Door::_expire() {
  const auto now = std::chrono::steady_clock::now();
  for (auto pending = calls_.begin(); pending != calls_.end();) {
    const auto candidate = pending++;
    if (candidate->call.deadline > now) continue;
    _complete(candidate, nullptr, clientError(ClientErrorCode::TimedOut, "no answer in time"));
  }
}

void Door::_failAll(const Error& error) {
  Calls ended;
  ended.swap(calls_);
  while (!ended.empty()) {
    calls_.splice(calls_.begin(), ended, ended.begin());
    _complete(calls_.begin(), nullptr, error);
  }
}

void Door::close(const Error& error) {
  loop_.assertCurrent();
  state_ = State::Closed;
  _failAll(error);
  connection_.reset();
}

}  // namespace zelkor
