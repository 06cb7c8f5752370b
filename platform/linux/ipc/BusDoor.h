#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <unordered_map>
#include <variant>

#include "base/Subscription.h"
#include "platform/linux/ipc/BusCaller.h"
#include "platform/linux/ipc/BusPointers.h"
#include "platform/linux/ipc/DelegatePort.h"
#include "platform/linux/ipc/Dispatcher.h"
#include "platform/linux/ipc/IpcContext.h"

namespace zelkord::ipc {

// The session bus, connected and asked for a name. Blocks; made before the loop serves it.
struct BusName {
  enum class Outcome { Owned, Taken, NoBus };
  Outcome outcome = Outcome::NoBus;
  BusPtr bus;
  int error = 0;  // errno; of the last two outcomes
};
BusName acquireBusName(const std::string& address, const std::string& name);

// The door on the session bus.
//
// States: serving; closed, by us or because the bus went away: its connections have then ended.
// Threading: the loop, except `port`. Ownership: the transport; `close` first, then
// destroy.
class BusDoor final {
 public:
  using OpenPrivate = std::function<FileHandle(Peer)>;

  BusDoor(IpcContext& context, BusPtr bus, ListenerConfiguration configuration,
          std::shared_ptr<ListenerDelegate> delegate, std::string serviceInterface,
          OpenPrivate openPrivate);

  void start();
  void close();
  // A signal with one string, or without; to everybody when `destination` is empty.
  void signal(const std::string& destination, const std::string& interface,
              const std::string& member, std::optional<std::string> text);

  // For its callers.
  Dispatcher& dispatcher() { return dispatcher_; }
  DelegatePort& port() { return *port_; }
  void send(MessagePtr message, std::size_t bytes);
  FileHandle openPrivateConnection(Peer peer) { return openPrivate_(peer); }
  // The name has left the bus; its caller ends once sd-bus is off the stack.
  void vanished(const std::string& name);

 private:
  static int _onMessage(sd_bus_message* message, void* self, sd_bus_error* error);
  int _take(sd_bus_message* message);
  void _pump();
  void _updateWaiting();
  void _lost();

  // Fixed after construction.
  IpcContext& context_;
  const std::shared_ptr<DelegatePort> port_;
  const OpenPrivate openPrivate_;

  // Loop state.
  Dispatcher dispatcher_;
  BusPtr bus_;
  SlotPtr filter_;
  Subscription watch_;
  Subscription timeout_;
  bool pumpsSoon_ = false;
  std::uint32_t events_ = 0;
  std::unordered_map<std::string, std::unique_ptr<BusCaller>> callers_;
  // For tasks that may run after the end.
  const std::shared_ptr<BusDoor*> self_ = std::make_shared<BusDoor*>(this);
};

}  // namespace zelkord::ipc
