#pragma once

#include <functional>
#include <string>

#include "base/Subscription.h"
#include "platform/linux/ipc/Authenticator.h"
#include "platform/linux/loop/Loop.h"
#include "platform/linux/system/Descriptor.h"

namespace zelkord::ipc {

// One admitted socket while it authenticates. Reads nothing beyond the end of the authentication.
//
// Threading: the loop. Ownership: its listener, which lets go of it once it has finished.
// Errors: garbage, a time-out and a peer that went away finish it without success; the socket is
// then closed.
class Handshake {
 public:
  // Called once, never from within `start`.
  using Finished = std::function<void(bool succeeded)>;

  Handshake(Loop& loop, Descriptor socket, Authenticator authenticator, Finished finished);
  void start(Duration limit);

  Descriptor takeSocket();
  bool passesDescriptors() const;

 private:
  void _ready(std::uint32_t events) ZK_REQUIRES(loop_);
  // False when the peer has to send more first.
  bool _step() ZK_REQUIRES(loop_);
  bool _reply(std::string_view text) ZK_REQUIRES(loop_);
  void _finish(bool succeeded) ZK_REQUIRES(loop_);

  Loop& loop_;

  // Loop state.
  Descriptor socket_ ZK_ON(loop_);
  Authenticator authenticator_ ZK_ON(loop_);
  Finished finished_ ZK_ON(loop_);
  Subscription watch_ ZK_ON(loop_);
  Subscription timer_ ZK_ON(loop_);
};

}  // namespace zelkord::ipc
