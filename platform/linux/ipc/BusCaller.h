#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/linux/ipc/BusOutlet.h"
#include "platform/linux/ipc/BusPointers.h"
#include "platform/linux/ipc/Dispatcher.h"
#include "platform/linux/ipc/ServedConnection.h"

namespace zelkord::ipc {

class BusDoor;

// One unique name that has called us, until it vanishes.
//
// States: Checking (the bus driver is asked who it is; calls wait), Known, Refused (another user,
// or too many callers of its process: every call is denied). Within Known there is at most one
// client connection, begun by a call of the connection interface. Threading: the loop. Ownership:
// the bus door.
class BusCaller final : public Caller, public ClientMemory::Holder {
 public:
  BusCaller(BusDoor& door, IpcContext& context, sd_bus* bus, std::string name);
  ~BusCaller() override;

  // Asks the driver; the name's end is told to the door from then on.
  void start();
  void take(sd_bus_message* message);
  // Ends what there is without a word to the client.
  void end();

  // Caller
  Outlet& outlet() override { return *plain_; }
  Receiver receiver(const std::string& interface) override;
  FileHandle openPrivateConnection() override;
  void cutOff(const std::string& reason) override;
  bool isPrivate() const override { return false; }
  ServedConnection* connection() override;

  // ClientMemory::Holder, while there is a connection
  const std::shared_ptr<CallFlow>& calls() const override;
  std::size_t messageBytes() const override { return 0; }
  std::size_t largestMessage() const override { return 0; }
  void cutOffForMemory() override;

 private:
  enum class State { Checking, Known, Refused };
  // A connection and its way out.
  struct Session {
    std::shared_ptr<BusOutlet> outlet;
    std::shared_ptr<ServedConnection> connection;
    Budget::Share share;
    Subscription holding;
    Subscription open;
  };
  // A call while the driver is asked.
  struct Waiting {
    TakenCall call;
    CallFlow::Share share;
  };
  struct Refusal {
    std::string_view error;
    std::string_view text;
  };

  static int _onOwnerChanged(sd_bus_message* message, void* self, sd_bus_error* error);
  static int _onCredentials(sd_bus_message* message, void* self, sd_bus_error* error);
  static int _onMatched(sd_bus_message* message, void* self, sd_bus_error* error);
  void _identified(sd_bus_message* answer) ZK_REQUIRES(context_.loop);
  void _wait(TakenCall call) ZK_REQUIRES(context_.loop);
  void _serve(TakenCall call) ZK_REQUIRES(context_.loop);
  std::optional<Refusal> _admit(std::optional<std::uint32_t> uid, std::optional<std::uint32_t> pid)
      ZK_REQUIRES(context_.loop);
  Receiver _beginConnection() ZK_REQUIRES(context_.loop);
  Session _makeSession() ZK_REQUIRES(context_.loop);
  void _invalidateConnection() ZK_REQUIRES(context_.loop);
  void _endConnection() ZK_REQUIRES(context_.loop);

  // Fixed after construction.
  BusDoor& door_;
  IpcContext& context_;
  sd_bus* const bus_;
  const std::string name_;
  const std::shared_ptr<BusOutlet> plain_;  // for what belongs to no connection

  // Loop state.
  State state_ ZK_ON(context_.loop) = State::Checking;
  Refusal refusal_ ZK_ON(context_.loop);
  Peer peer_ ZK_ON(context_.loop);
  Budget::Share share_ ZK_ON(context_.loop);
  std::vector<Waiting> waiting_ ZK_ON(context_.loop);
  Session connection_ ZK_ON(context_.loop);
  Session shared_ ZK_ON(context_.loop);  // serves the shared handler
  SlotPtr match_ ZK_ON(context_.loop);
  SlotPtr query_ ZK_ON(context_.loop);
};

}  // namespace zelkord::ipc
