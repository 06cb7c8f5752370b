#pragma once

#include <functional>
#include <list>
#include <memory>
#include <optional>
#include <string>

#include "base/Error.h"
#include "base/Time.h"
#include "corezelkor/client/internal/BusConnection.h"
#include "corezelkor/client/internal/ClientLoop.h"
#include "corezelkor/client/internal/MessageReader.h"
#include "corezelkor/client/internal/MessageWriter.h"

namespace zelkor {

// One call of the daemon.
struct DoorCall {
  // Null with an error; the reader is at the reply's beginning.
  using Completion = std::function<void(MessageReader*, std::optional<Error>)>;

  std::string interface;
  std::string member;
  std::function<void(MessageWriter&)> encode;
  Completion completion;  // runs once, on the client's thread
  ClientTime deadline;
};

// The connection that a client's calls go through; it comes back by itself at the next call.
//
// States: closed; opening (calls wait); open. A lost connection fails the calls that were sent and
// leaves it closed.
// Threading: the client's thread. Ownership: the loop outlives it; `open` may answer at any later
// time, from outside of sd-bus call-backs or inside.
// Errors: every call is completed exactly once: with the reply, or with a client error.
class Door {
 public:
  using Opened = std::function<void(std::unique_ptr<BusConnection>, std::optional<Error>)>;
  struct Behaviour {
    std::function<void(Opened)> open;
    std::function<void(BusConnection&)> didOpen;  // before the waiting calls are sent
    std::function<void(const Error&)> didFail;    // it did not open
    std::function<void()> didClose;               // the other side ended it
  };

  Door(const ClientLoop& loop, Behaviour behaviour);
  ~Door();

  void call(DoorCall call);
  // Begins to open unless it does already.
  void open();
  bool isOpen() const;
  // Works on the connection and completes calls whose time is over.
  void turn(LoopWait& wait);
  // Completes all calls with the error; the connection closes.
  void close(const Error& error);

 private:
  enum class State { Closed, Opening, Open };
  struct Pending {
    DoorCall call;
    std::unique_ptr<BusCall> sent;  // null while it waits for the connection
  };
  using Calls = std::list<Pending>;

  void _didOpen(std::unique_ptr<BusConnection> connection, std::optional<Error> error);
  void _send(Calls::iterator pending) ZK_REQUIRES(loop_);
  std::optional<Error> _transmit(Calls::iterator pending) ZK_REQUIRES(loop_);
  void _complete(Calls::iterator pending, sd_bus_message* reply, std::optional<Error> error);
  void _expire() ZK_REQUIRES(loop_);
  void _failAll(const Error& error) ZK_REQUIRES(loop_);

  const ClientLoop& loop_;
  const Behaviour behaviour_;

  State state_ ZK_ON(loop_) = State::Closed;
  std::unique_ptr<BusConnection> connection_ ZK_ON(loop_);
  Calls calls_ ZK_ON(loop_);  // after the connection: they end first
};

}  // namespace zelkor
