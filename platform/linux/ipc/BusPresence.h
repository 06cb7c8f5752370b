#pragma once

#include <functional>
#include <memory>
#include <string>

#include "base/Subscription.h"
#include "platform/linux/ipc/BusDoor.h"
#include "platform/linux/ipc/IpcContext.h"

namespace zelkord::ipc {

// The daemon's place on the session bus: its door while the bus is there, the way back to it while
// it is not.
//
// States: Absent (looks for the bus again when its socket appears, and after a while), Joining
// (connected, the name is asked for), Queued (another program has the name; it comes to us when
// that lets go), Present. Private connections are untouched by all of it.
// Threading: the loop. Ownership: the transport; `close` first, then destroy.
// Errors: the loss of the bus, and a name that is taken, are one error line each.
class BusPresence final {
 public:
  using MakeDoor = std::function<std::unique_ptr<BusDoor>(BusPtr bus, BusDoor::Events events)>;

  BusPresence(IpcContext& context, std::string name, MakeDoor makeDoor);
  ~BusPresence();

  // With a bus that has the name; null: there is none yet.
  void begin(BusPtr bus);
  void close();
  // Null while the name is not ours.
  BusDoor* door();

 private:
  enum class State { Absent, Joining, Queued, Present };

  void _openDoor(BusPtr bus) ZK_REQUIRES(context_.loop);
  void _lost() ZK_REQUIRES(context_.loop);
  void _waitForTheBus() ZK_REQUIRES(context_.loop);
  void _mayBeThere() ZK_REQUIRES(context_.loop);
  void _join() ZK_REQUIRES(context_.loop);
  void _nameAnswered(BusDoor::NameAnswer answer) ZK_REQUIRES(context_.loop);
  void _nameAcquired(const std::string& name) ZK_REQUIRES(context_.loop);
  void _becomePresent() ZK_REQUIRES(context_.loop);

  // Fixed after construction.
  IpcContext& context_;
  const std::string name_;
  const MakeDoor makeDoor_;

  // Loop state.
  State state_ ZK_ON(context_.loop) = State::Absent;
  std::unique_ptr<BusDoor> door_ ZK_ON(context_.loop);
  int attempts_ ZK_ON(context_.loop) = 0;
  Subscription nextAttempt_ ZK_ON(context_.loop);
  Subscription watch_ ZK_ON(context_.loop);
  // For tasks that may run after the end.
  const std::shared_ptr<BusPresence*> self_ = std::make_shared<BusPresence*>(this);
};

// The wait before the next attempt after so many in vain: doubled from a tenth of a second to a
// minute.
Duration rejoinDelay(int attempts);

// The file of the bus's socket; empty when the address names none.
std::string socketPathOf(const std::string& address);

}  // namespace zelkord::ipc
