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

namespace zelkord::ipc {
namespace {

constexpr int kAcceptsInARow = 16;
constexpr auto kAcceptPause = 100ms;

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
  socket_.emplace(std::move(socket));
  watch_ =
      context_.loop.watch(socket_->descriptor(), EPOLLIN, [this](std::uint32_t) { _accept(); });
}

void PrivateListener::close() {
  closed_ = true;
  watch_.reset();
  pause_.reset();
  socket_.reset();
  for (auto& [key, guest] : std::exchange(guests_, {})) port_->release(std::move(guest.place));
  std::vector<std::shared_ptr<PrivateLink>> ending;
  for (const auto& [key, link] : links_) ending.push_back(link);
  for (const auto& link : ending) link->end();
}

void PrivateListener::_accept() {
  for (int i = 0; i < kAcceptsInARow; ++i) {
    OwnedFd socket(
        ::accept4(socket_->descriptor(), nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK));
    if (!socket) {
      if (errno == EMFILE || errno == ENFILE || errno == ENOBUFS || errno == ENOMEM)
        _pauseAccepting();
      return;
    }
    const auto peer = peerOfSocket(socket.get());
    if (peer) _consider(std::move(socket), {peer->pid, peer->uid});
  }
}

// Without it, the socket that cannot be accepted would wake the loop again at once.
void PrivateListener::_pauseAccepting() {
  context_.log.error("no new connections for a moment: {}", std::strerror(errno));
  context_.loop.changeEvents(socket_->descriptor(), 0);
  pause_ = context_.loop.after(
      kAcceptPause, [this] { context_.loop.changeEvents(socket_->descriptor(), EPOLLIN); });
}

void PrivateListener::_consider(OwnedFd socket, Peer peer) {
  if (peer.uid != ::geteuid()) {
    context_.log.error("connection of user {} refused", peer.uid);
    return;
  }
  auto arrival =
      std::make_shared<Arrival>(Arrival{std::move(socket), peer, std::chrono::steady_clock::now()});
  port_->askAdmission(peer, [weak = weak_from_this(), inbox = context_.loop.inbox(),
                             arrival = std::move(arrival)](std::optional<Subscription> place) {
    if (!place) {
      arrival->socket.reset();
      return;
    }
    auto held = std::make_shared<Subscription>(std::move(*place));
    inbox->post([weak, arrival, held] {
      if (const auto self = weak.lock()) self->_admitted(std::move(*arrival), std::move(*held));
    });
  });
}

void PrivateListener::_admitted(Arrival arrival, Subscription place) {
  if (closed_ || !arrival.socket) return port_->release(std::move(place));
  const auto key = ++lastHandshake_;
  const auto elapsed = std::chrono::steady_clock::now() - arrival.accepted;
  auto handshake = std::make_unique<Handshake>(context_.loop, std::move(arrival.socket),
                                               Authenticator(arrival.peer.uid, serverId_),
                                               [weak = weak_from_this(), key](bool succeeded) {
                                                 if (const auto self = weak.lock())
                                                   self->_authenticated(key, succeeded);
                                               });
  handshake->start(context_.options.authenticationTimeout - elapsed);
  guests_[key] = {std::move(handshake), arrival.peer, std::move(place)};
}

void PrivateListener::_authenticated(std::uint64_t handshake, bool succeeded) {
  auto node = guests_.extract(handshake);
  if (node.empty()) return;
  auto& guest = node.mapped();
  auto bus = succeeded
                 ? adoptSocket(guest.handshake->takeSocket(), guest.handshake->passesDescriptors())
                 : nullptr;
  if (!bus) return port_->release(std::move(guest.place));
  _begin(std::move(bus), guest.peer, std::move(guest.place));
}

void PrivateListener::_begin(BusPtr bus, Peer peer, Subscription place) {
  auto link =
      std::make_shared<PrivateLink>(*this, context_, std::move(bus), peer, std::move(place));
  links_[link.get()] = link;
  link->start();
  port_->announce(link->connection());
}

FileHandle PrivateListener::openConnection(Peer peer) {
  int pair[2];
  if (closed_ || ::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, pair) != 0) return {};
  FileHandle client(pair[0]);
  _consider(OwnedFd(pair[1]), peer);
  return client;
}

void PrivateListener::broadcast(const std::string& interface, const std::string& member,
                                const std::string& text) {
  const auto links = links_;  // sending may end one
  for (const auto& [key, link] : links) {
    sd_bus_message* signal = nullptr;
    if (!link->bus() || sd_bus_message_new_signal(link->bus(), &signal, kObjectPath.data(),
                                                  interface.c_str(), member.c_str()) < 0) {
      continue;
    }
    MessagePtr owned(signal);
    if (sd_bus_message_append_basic(signal, 's', text.c_str()) < 0) continue;
    link->send(std::move(owned), 256 + text.size());
  }
}

}  // namespace zelkord::ipc
