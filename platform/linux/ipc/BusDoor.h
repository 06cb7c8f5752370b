#pragma once

#include <deque>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <unordered_map>
#include <variant>
#include <vector>

#include "base/Subscription.h"
#include "platform/linux/ipc/BusCaller.h"
#include "platform/linux/ipc/BusPointers.h"
#include "platform/linux/ipc/DelegatePort.h"
#include "platform/linux/ipc/Dispatcher.h"
#include "platform/linux/ipc/IpcContext.h"

namespace zelkord::ipc {

// The session bus, connected and asked for a name. Blocks, but for two seconds at most: one that
// accepts and does not answer is none (ETIMEDOUT). Made before the loop serves it.
struct BusName {
  enum class Outcome { Owned, Taken, NoBus };
  Outcome outcome = Outcome::NoBus;
  BusPtr bus;
  int error = 0;  // errno; of the last two outcomes
};
BusName acquireBusName(const std::string& address, const std::string& name);
// Only connects; never blocks. Empty address: the session's own bus. Zero or a negative errno.
int openSessionBus(const std::string& address, BusPtr& out);

// The door on the session bus.
//
// States: serving; closed, by us or because the bus went away: its connections have then ended.
// Threading: the loop, except `port`. Ownership: whoever hears of its events; destroyed when
// nothing of it is on the stack.
class BusDoor final {
 public:
  using OpenPrivate = std::function<FileHandle(Peer)>;
  struct Events {
    std::function<void()> lost;  // once
    // A name that the bus has given us.
    std::function<void(const std::string& name)> nameAcquired;
  };
  enum class NameAnswer { Owned, Queued, Failed };

  BusDoor(IpcContext& context, BusPtr bus, ListenerConfiguration configuration,
          std::shared_ptr<ListenerDelegate> delegate, std::string serviceInterface,
          OpenPrivate openPrivate, Events events);
  ~BusDoor();

  void start();
  void close();
  // Asks for the name, and to be given it later when another program has it.
  void requestName(const std::string& name, std::function<void(NameAnswer)> answered);
  // As if the bus had gone.
  void lose();
  // A signal with one string, or without; to everybody when `destination` is empty.
  void signal(const std::string& destination, const std::string& interface,
              const std::string& member, std::optional<std::string> text);

  // For its callers.
  Dispatcher& dispatcher() { return dispatcher_; }
  DelegatePort& port() { return *port_; }
  // Calls of those of whom it is not known yet what process they are.
  CallFlow& unidentified() { return *unidentified_; }
  void send(MessagePtr message, std::size_t bytes);
  FileHandle openPrivateConnection(Peer peer) { return openPrivate_(peer); }
  // The name has left the bus, or its next call begins anew: its caller ends now, and goes once
  // sd-bus is off the stack.
  void vanished(const std::string& name);

 private:
  static int _onMessage(sd_bus_message* message, void* self, sd_bus_error* error);
  int _take(sd_bus_message* message) ZK_REQUIRES(context_.loop);
  void _pump() ZK_REQUIRES(context_.loop);
  void _updateWaiting() ZK_REQUIRES(context_.loop);
  bool _hasRoomToSend() ZK_REQUIRES(context_.loop);
  void _takeDriverSignal(sd_bus_message* signal);
  static int _onNameAnswer(sd_bus_message* message, void* self, sd_bus_error* error);

  // Fixed after construction.
  IpcContext& context_;
  const std::shared_ptr<DelegatePort> port_;
  const OpenPrivate openPrivate_;
  const Events events_;
  const std::shared_ptr<CallFlow> unidentified_;

  // Loop state.
  Dispatcher dispatcher_;
  BusPtr bus_ ZK_ON(context_.loop);
  SlotPtr filter_ ZK_ON(context_.loop);
  Subscription watch_ ZK_ON(context_.loop);
  Subscription timeout_ ZK_ON(context_.loop);
  bool pumpsSoon_ ZK_ON(context_.loop) = false;
  std::uint32_t waitsFor_ ZK_ON(context_.loop) = 0;
  std::deque<std::size_t> queued_
      ZK_ON(context_.loop);  // sizes of the messages that wait, oldest first
  std::size_t queuedBytes_ ZK_ON(context_.loop) = 0;
  SlotPtr nameRequest_ ZK_ON(context_.loop);
  std::function<void(NameAnswer)> nameAnswered_ ZK_ON(context_.loop);
  std::unordered_map<std::string, std::unique_ptr<BusCaller>> callers_ ZK_ON(context_.loop);
  // Have ended and answer nothing any more; one of them may be what sd-bus is calling.
  std::vector<std::unique_ptr<BusCaller>> gone_ ZK_ON(context_.loop);
  // For tasks that may run after the end.
  const std::shared_ptr<BusDoor*> self_ = std::make_shared<BusDoor*>(this);
};

}  // namespace zelkord::ipc
