#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <utility>

#include "base/Error.h"
#include "corezelkor/client/internal/BusPointers.h"
#include "corezelkor/client/internal/ClientLoop.h"

namespace zelkor {

// A call whose answer is awaited. Destroying it drops the answer.
struct BusCall {
  // Either a message or the error that stands for it.
  using Handler = std::function<void(sd_bus_message*, std::optional<Error>)>;
  Handler handler;
  SlotPointer slot;
};

// One sd-bus connection, to a bus or straight to the daemon.
//
// States: open from construction (authentication goes on by itself, calls may be made at once);
// closed once process() says so, for ever. Calls under way at that moment end as Disconnected.
// Threading: the client's thread only. Ownership: the calls end before it does.
class BusConnection {
 public:
  // Null, with the reason in `why`, when the attempt fails at once, or somebody else's process
  // serves that socket. To an address: waits for a place there for up to a second.
  // `ownedDescriptor` is taken over either way.
  static std::unique_ptr<BusConnection> toPeer(const std::string& address, std::string& why);
  static std::unique_ptr<BusConnection> toPeer(int ownedDescriptor, std::string& why);
  // An empty address: the session bus of the user.
  static std::unique_ptr<BusConnection> toBus(const std::string& address, std::string& why);

  explicit BusConnection(BusPointer bus) : bus_(std::move(bus)) {}

  sd_bus* bus() const { return bus_.get(); }
  // Null when it cannot be sent at all.
  std::unique_ptr<BusCall> call(sd_bus_message* message, BusCall::Handler handler);
  // Does all work that is due. False when the connection has ended.
  bool process();
  void addTo(LoopWait& wait) const;

 private:
  const BusPointer bus_;
  bool moreToDo_ = false;
};

// The error that a D-Bus error reply stands for.
Error errorOfReply(const sd_bus_error& error);

}  // namespace zelkor
