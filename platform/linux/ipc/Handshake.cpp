#include "platform/linux/ipc/Handshake.h"

#include <sys/epoll.h>
#include <sys/socket.h>

#include <array>
#include <cerrno>
#include <utility>

namespace zelkord::ipc {

Handshake::Handshake(Loop& loop, Descriptor socket, Authenticator authenticator, Finished finished)
    : loop_(loop),
      socket_(std::move(socket)),
      authenticator_(std::move(authenticator)),
      finished_(std::move(finished)) {}

void Handshake::start(Duration limit) {
  loop_.assertCurrent();
  // Edge-triggered: half a line stays in the socket until the rest has come.
  watch_ = loop_.watch(socket_.get(), EPOLLIN | EPOLLRDHUP | EPOLLET, [this](std::uint32_t events) {
    loop_.assertCurrent();
    _ready(events);
  });
  timer_ = loop_.after(limit, [this] {
    loop_.assertCurrent();
    _finish(false);
  });
}

Descriptor Handshake::takeSocket() {
  loop_.assertCurrent();
  return std::move(socket_);
}

bool Handshake::passesDescriptors() const {
  loop_.assertCurrent();
  return authenticator_.passesDescriptors();
}

void Handshake::_ready(std::uint32_t events) {
  while (_step()) {
  }
  if (authenticator_.state() == Authenticator::State::Done) return _finish(true);
  const bool hungUp = (events & (EPOLLHUP | EPOLLRDHUP | EPOLLERR)) != 0;
  if (hungUp || authenticator_.state() == Authenticator::State::Failed) _finish(false);
}

bool Handshake::_step() {
  if (authenticator_.state() == Authenticator::State::Done) return false;
  std::array<char, 1024> bytes;
  const auto seen = ::recv(socket_.get(), bytes.data(), bytes.size(), MSG_PEEK | MSG_DONTWAIT);
  if (seen <= 0) return false;
  const auto length = authenticator_.stepLength({bytes.data(), static_cast<std::size_t>(seen)});
  if (length == 0) return false;
  if (::recv(socket_.get(), bytes.data(), length, MSG_DONTWAIT) != static_cast<ssize_t>(length)) {
    return false;
  }
  const auto reply = authenticator_.step({bytes.data(), length});
  return authenticator_.state() != Authenticator::State::Failed && _reply(reply);
}

// A peer that does not read while it authenticates is given up.
bool Handshake::_reply(std::string_view text) {
  if (text.empty()) return true;
  const auto sent = ::send(socket_.get(), text.data(), text.size(), MSG_NOSIGNAL | MSG_DONTWAIT);
  if (sent == static_cast<ssize_t>(text.size())) return true;
  _finish(false);
  return false;
}

void Handshake::_finish(bool succeeded) {
  if (!finished_) return;
  watch_.reset();
  timer_.reset();
  loop_.soon([finished = std::exchange(finished_, nullptr), succeeded] { finished(succeeded); });
}

}  // namespace zelkord::ipc
