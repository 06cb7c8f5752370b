#include "platform/linux/ipc/PrivateListener.h"

#include <sys/epoll.h>
#include <sys/socket.h>
#include <systemd/sd-id128.h>

#include <cerrno>
#include <cstring>
#include <utility>
#include <vector>

#include "platform/linux/ipc/Introspection.h"
#include "platform/linux/ipc/SocketAdoption.h"
#include "platform/linux/ipc/WireEncoding.h"

namespace zelkord::ipc {
namespace {

constexpr auto kAcceptTime = 2ms;  // in a row
constexpr auto kAcceptPause = 100ms;
constexpr auto kTimeToAuthenticateInScarcity = 1s;
// For a moment, besides the socket's own.
constexpr std::size_t kDescriptorsToAdopt = 3;

bool isScarcity(int error) {
  return error == EMFILE || error == ENFILE || error == ENOBUFS || error == ENOMEM;
}

std::string makeServerId() {
  sd_id128_t id{};
  char text[SD_ID128_STRING_MAX];
  sd_id128_randomize(&id);
  return sd_id128_to_string(id, text);
}

}  // namespace

PrivateListener::PrivateListener(IpcContext& context, ListenerConfiguration configuration,
                                 std::shared_ptr<ListenerDelegate> delegate,
                                 std::string serviceInterface)
    : context_(context),
      port_(std::make_shared<DelegatePort>(context, std::move(delegate))),
      serverId_(makeServerId()),
      dispatcher_(context, std::move(configuration), std::move(serviceInterface)) {}

void PrivateListener::serve(ListeningSocket socket) {
  context_.loop.assertCurrent();
  socket_.emplace(std::move(socket));
  watch_ = context_.loop.watch(socket_->descriptor(), EPOLLIN, [this](std::uint32_t) {
    context_.loop.assertCurrent();
    _accept();
  });
}

void PrivateListener::close() {
  context_.loop.assertCurrent();
  closed_ = true;
  watch_.reset();
  pause_.reset();
  socket_.reset();
  while (!guests_.empty()) _dismiss(guests_.begin()->first);
  std::vector<std::shared_ptr<PrivateLink>> ending;
  for (const auto& [key, link] : links_) ending.push_back(link);
  for (const auto& link : ending) link->end();
}

// All who wait, before the backlog is full and turns others away; between turns of the rest.
void PrivateListener::_accept() {
  if (closed_ || acceptsOn_) return;
  const auto end = std::chrono::steady_clock::now() + kAcceptTime;
  while (std::chrono::steady_clock::now() < end) {
    auto socket = _acceptOne();
    if (!socket) return;
    const auto peer = peerOfSocket(socket.get());
    if (peer) _consider(std::move(socket), {peer->pid, peer->uid});
  }
  acceptsOn_ = true;
  context_.loop.soon([weak = weak_from_this()] {
    const auto self = weak.lock();
    if (!self) return;
    self->context_.loop.assertCurrent();
    self->acceptsOn_ = false;
    self->_accept();
  });
}

Descriptor PrivateListener::_acceptOne() {
  const auto accept = [from = socket_->descriptor()] {
    return Descriptor(::accept4(from, nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK));
  };
  auto socket = accept();
  if (!socket && isScarcity(errno)) {
    if (!context_.reserve->spend(1 + kDescriptorsToAdopt) &&
        !context_.connections->evictOldest(kTimeToAuthenticateInScarcity)) {
      _pauseAccepting();
      return socket;
    }
    socket = accept();
    context_.reserve->refill();
  }
  return socket;
}

// Without it, the socket that cannot be accepted would wake the loop again at once.
void PrivateListener::_pauseAccepting() {
  context_.limits.refused("descriptors", "all connections");
  context_.loop.changeEvents(socket_->descriptor(), 0);
  pause_ = context_.loop.after(kAcceptPause, [this] {
    context_.loop.assertCurrent();
    context_.reserve->refill();
    context_.loop.changeEvents(socket_->descriptor(), EPOLLIN);
  });
}

bool PrivateListener::_consider(Descriptor socket, Peer peer) {
  if (peer.uid != ::geteuid()) {
    context_.log.error("connection of user {} refused", peer.uid);
    return false;
  }
  Guest guest{std::move(socket), peer, std::chrono::steady_clock::now(), {}, {}, nullptr};
  const bool delegateBounds = dispatcher_.configuration().delegateBoundsConnections;
  auto& budgets = *context_.connections;
  auto share = delegateBounds ? budgets.takeUnadmitted(peer.pid) : budgets.take(peer.pid);
  if (!share) return false;
  guest.admission.share = *std::move(share);
  const auto key = ++lastGuest_;
  if (!delegateBounds) {
    guest.waiting = budgets.awaitAuthentication(peer.pid, [this, key] {
      context_.loop.assertCurrent();
      _dismiss(key);
    });
  }
  guests_.emplace(key, std::move(guest));
  _askAdmission(key, peer);
  return true;
}

void PrivateListener::_askAdmission(std::uint64_t guest, Peer peer) {
  port_->askAdmission(peer, [weak = weak_from_this(), inbox = context_.loop.inbox(),
                             guest](std::optional<Subscription> place) {
    auto held = std::make_shared<std::optional<Subscription>>(std::move(place));
    inbox->post([weak, guest, held] {
      const auto self = weak.lock();
      if (!self) return;
      self->context_.loop.assertCurrent();
      self->_admitted(guest, std::move(*held));
    });
  });
}

void PrivateListener::_admitted(std::uint64_t key, std::optional<Subscription> place) {
  const auto found = guests_.find(key);
  if (found == guests_.end()) {
    if (place) port_->release(*std::move(place));
    return;
  }
  if (!place) return _dismiss(key);
  auto& guest = found->second;
  guest.admission.place = *std::move(place);
  if (dispatcher_.configuration().delegateBoundsConnections) guest.admission.share.reset();
  guest.handshake = std::make_unique<Handshake>(context_.loop, std::move(guest.socket),
                                                Authenticator(guest.peer.uid, serverId_),
                                                [weak = weak_from_this(), key](bool succeeded) {
                                                  const auto self = weak.lock();
                                                  if (!self) return;
                                                  self->context_.loop.assertCurrent();
                                                  self->_authenticated(key, succeeded);
                                                });
  const auto elapsed = std::chrono::steady_clock::now() - guest.accepted;
  guest.handshake->start(context_.options.authenticationTimeout - elapsed);
}

void PrivateListener::_authenticated(std::uint64_t key, bool succeeded) {
  const auto found = guests_.find(key);
  if (found == guests_.end()) return;
  auto& guest = found->second;
  auto bus = succeeded ? _adopt(*guest.handshake) : nullptr;
  if (!bus) return _dismiss(key);
  const auto link = std::make_shared<PrivateLink>(*this, context_, std::move(bus), guest.peer,
                                                  std::move(guest.admission));
  guests_.erase(found);
  links_[link.get()] = link;
  link->start();
  port_->announce(link->served());
}

void PrivateListener::_dismiss(std::uint64_t key) {
  auto node = guests_.extract(key);
  if (node.empty()) return;
  if (auto& place = node.mapped().admission.place) port_->release(std::move(place));
}

// It takes a few descriptors for a moment.
BusPtr PrivateListener::_adopt(Handshake& handshake) {
  auto socket = handshake.takeSocket();
  auto bus = adoptSocket(socket, handshake.passesDescriptors());
  if (!bus && context_.reserve->spend(kDescriptorsToAdopt)) {
    bus = adoptSocket(socket, handshake.passesDescriptors());
  }
  context_.reserve->refill();
  return bus;
}

FileHandle PrivateListener::openConnection(Peer peer) {
  context_.loop.assertCurrent();
  int pair[2];
  if (closed_ || ::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, pair) != 0) return {};
  FileHandle client(pair[0]);
  return _consider(Descriptor(pair[1]), peer) ? client : FileHandle();
}

void PrivateListener::forget(PrivateLink& link) {
  context_.loop.assertCurrent();
  links_.erase(&link);
}

void PrivateListener::broadcast(const std::string& interface, const std::string& member,
                                const std::string& text) {
  context_.loop.assertCurrent();
  const auto links = links_;  // sending may end one
  const auto valid = wireText(text);
  for (const auto& [key, link] : links) {
    sd_bus_message* signal = nullptr;
    if (!link->bus() || sd_bus_message_new_signal(link->bus(), &signal, kObjectPath.data(),
                                                  interface.c_str(), member.c_str()) < 0) {
      continue;
    }
    MessagePtr owned(signal);
    if (sd_bus_message_append_basic(signal, 's', valid.c_str()) < 0) continue;
    link->send(std::move(owned), 256 + text.size());
  }
}

}  // namespace zelkord::ipc
