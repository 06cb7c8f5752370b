#pragma once

#include <memory>
#include <optional>
#include <string>

#include "corezelkor/client/ClientOptions.h"
#include "corezelkor/client/internal/BusConnection.h"
#include "corezelkor/client/internal/Door.h"

namespace zelkor {

// Finds the daemon: at the address or socket that the options name, else by asking on the bus,
// else at the usual socket.
//
// States: at rest; asking (a bus connection stands and Open is under way). Any end of asking leads
// back to rest and answers once.
// Threading: the client's thread. Ownership: the options outlive it; destroying it drops the
// answer. Errors: NotReachable with what was tried.
class ServiceOpener {
 public:
  explicit ServiceOpener(const ClientOptions& options) : options_(options) {}

  // At rest only. `opened` may be called before this returns.
  void open(Door::Opened opened);
  void turn(LoopWait& wait);
  // Back to rest without an answer. Not from a call-back.
  void stop();

 private:
  void _ask();
  void _sendOpen();
  void _didAnswer(sd_bus_message* reply, const std::optional<Error>& error);
  void _connectToDescriptor(int descriptor);
  void _connectTo(const std::string& address);
  // The usual socket, after the bus did not help.
  void _fallBack(const std::string& why);
  void _finish(std::unique_ptr<BusConnection> connection, const std::string& why);

  const ClientOptions& options_;
  Door::Opened opened_;  // empty: at rest
  std::string tried_;
  ClientTime deadline_;
  std::unique_ptr<BusConnection> bus_;
  std::unique_ptr<BusCall> asking_;
};

}  // namespace zelkor
