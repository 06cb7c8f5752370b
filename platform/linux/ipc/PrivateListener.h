#pragma once

#include <map>
#include <memory>
#include <optional>
#include <string>
#include <unordered_map>

#include "platform/linux/ipc/DelegatePort.h"
#include "platform/linux/ipc/Dispatcher.h"
#include "platform/linux/ipc/Handshake.h"
#include "platform/linux/ipc/IpcContext.h"
#include "platform/linux/ipc/ListeningSocket.h"
#include "platform/linux/ipc/PrivateLink.h"

namespace zelkord::ipc {

// A private door: accepts sockets, has each admitted by the delegate and authenticated, and holds
// the connections.
//
// A socket goes through: accepted, the user checked, a place of the budget taken, admitted (where
// the delegate bounds the connections, its place takes the other's turn), authenticated, open. What
// ends earlier is closed without a byte, or with what the authentication said; up to there it may
// have to make room for another. Threading: the loop, except `port`. Ownership: the transport;
// `close` first, then destroy. Errors: out of descriptors, the reserve lets the next clients in;
// without that it stops accepting for a moment.
class PrivateListener final : public std::enable_shared_from_this<PrivateListener> {
 public:
  // `serviceInterface`: the interface with Open; empty for none.
  PrivateListener(IpcContext& context, ListenerConfiguration configuration,
                  std::shared_ptr<ListenerDelegate> delegate, std::string serviceInterface);

  void serve(ListeningSocket socket);
  void close();
  // Serves one end of a new socket pair for that peer and gives the other.
  FileHandle openConnection(Peer peer);
  void broadcast(const std::string& interface, const std::string& member, const std::string& text);

  // For its links.
  Dispatcher& dispatcher() { return dispatcher_; }
  DelegatePort& port() { return *port_; }
  void forget(PrivateLink& link);

 private:
  using Instant = std::chrono::steady_clock::time_point;
  // Accepted and not authenticated.
  struct Guest {
    Descriptor socket;  // until the handshake has it
    Peer peer;
    Instant accepted;
    PrivateLink::Admission admission;
    Subscription waiting;
    std::unique_ptr<Handshake> handshake;
  };

  void _accept() ZK_REQUIRES(context_.loop);
  Descriptor _acceptOne() ZK_REQUIRES(context_.loop);
  void _pauseAccepting() ZK_REQUIRES(context_.loop);
  // False: there is no place for it.
  bool _consider(Descriptor socket, Peer peer) ZK_REQUIRES(context_.loop);
  void _askAdmission(std::uint64_t guest, Peer peer) ZK_REQUIRES(context_.loop);
  void _admitted(std::uint64_t guest, std::optional<Subscription> place) ZK_REQUIRES(context_.loop);
  void _authenticated(std::uint64_t guest, bool succeeded) ZK_REQUIRES(context_.loop);
  void _dismiss(std::uint64_t guest) ZK_REQUIRES(context_.loop);
  BusPtr _adopt(Handshake& handshake) ZK_REQUIRES(context_.loop);

  // Fixed after construction.
  IpcContext& context_;
  const std::shared_ptr<DelegatePort> port_;
  const std::string serverId_;

  // Loop state.
  Dispatcher dispatcher_;
  bool closed_ ZK_ON(context_.loop) = false;
  // Goes on accepting in the next turn of the loop.
  bool acceptsOn_ ZK_ON(context_.loop) = false;
  std::optional<ListeningSocket> socket_ ZK_ON(context_.loop);
  Subscription watch_ ZK_ON(context_.loop);
  Subscription pause_ ZK_ON(context_.loop);
  std::uint64_t lastGuest_ ZK_ON(context_.loop) = 0;
  std::unordered_map<std::uint64_t, Guest> guests_ ZK_ON(context_.loop);
  std::unordered_map<PrivateLink*, std::shared_ptr<PrivateLink>> links_ ZK_ON(context_.loop);
};

}  // namespace zelkord::ipc
