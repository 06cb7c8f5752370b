#pragma once

#include <systemd/sd-bus.h>

#include <memory>
#include <string>
#include <variant>

#include "platform/api/Interprocess.h"
#include "platform/linux/ipc/IpcContext.h"
#include "platform/linux/ipc/Outlet.h"
#include "platform/linux/ipc/ServedConnection.h"
#include "platform/linux/ipc/WireDecoding.h"

namespace zelkord::ipc {

inline constexpr std::string_view kUnknownInterface = "org.freedesktop.DBus.Error.UnknownInterface";

// Who gets a call; without a connection, the error that its caller gets.
struct Receiver {
  std::shared_ptr<ServedConnection> connection;
  std::string_view error;
};

// Who made a call, as its door knows it.
// Threading: the loop.
class Caller {
 public:
  virtual ~Caller() = default;
  virtual Outlet& outlet() = 0;
  // Who gets the calls of that interface.
  virtual Receiver receiver(const std::string& interface) = 0;
  // A new private connection for the caller; an invalid handle when there is none to be had.
  virtual FileHandle openPrivateConnection() = 0;
  // Not the user we serve, or a message that cannot be one.
  virtual void cutOff(const std::string& reason) = 0;
  virtual bool isPrivate() const = 0;
  // The connection that its messages keep from being idle, whoever answers them; null: none.
  virtual ServedConnection* connection() = 0;
};

// A call that has been read off its message.
struct TakenCall {
  CallOrigin origin;
  std::string path;
  std::string interface;  // empty: any that has the member
  std::string member;
  // Of the dispatcher's configuration; null: there is no such method.
  const Interface* described = nullptr;
  const Method* method = nullptr;
  std::variant<Decoded, DecodeFailure> arguments;

  std::size_t bytes() const {
    const auto* decoded = std::get_if<Decoded>(&arguments);
    return decoded ? decoded->bytes : 0;
  }
};

// Takes a method call apart: answers what every D-Bus peer is asked, checks and decodes the rest,
// hands it on.
//
// Threading: the loop; never blocks.
// Errors: everything wrong with a call is answered; a message that is none ends its caller's
// connection.
class Dispatcher {
 public:
  // `serviceInterface` has Open; empty: no connection can be opened here.
  Dispatcher(IpcContext& context, ListenerConfiguration configuration,
             std::string serviceInterface);

  const ListenerConfiguration& configuration() const { return *configuration_; }
  void dispatch(sd_bus_message* message, Caller& caller);
  // The same in two steps.
  TakenCall take(sd_bus_message* call) const;
  void dispatch(TakenCall call, Caller& caller);
  // Tells the caller's connection of a message that goes nowhere else.
  static void noteMessage(Caller& caller);
  // Answers with an error of the transport itself.
  void refuse(Outlet& outlet, const CallOrigin& origin, std::string_view error,
              std::string_view text);

 private:
  void _findMethod(TakenCall& call) const;
  // True when the call is on its way to a handler.
  bool _dispatchCall(TakenCall& call, Caller& caller) ZK_REQUIRES(context_.loop);
  bool _answerBusDriver(const TakenCall& call, Caller& caller) ZK_REQUIRES(context_.loop);
  bool _answerStandard(const TakenCall& call, Caller& caller);
  void _answerProperties(const TakenCall& call, Caller& caller);
  bool _callObject(TakenCall& call, Caller& caller);
  void _refuseArguments(const CallOrigin& origin, const DecodeFailure& failure, Caller& caller);
  void _refuseUnknown(const TakenCall& call, Caller& caller);
  bool _deliver(const CallOrigin& origin, const Interface& interface, const Method& method,
                Decoded decoded, Caller& caller);
  void _open(const CallOrigin& origin, Caller& caller);
  const Interface* _interface(const std::string& name) const;

  IpcContext& context_;
  const std::string serviceInterface_;
  const std::shared_ptr<const ListenerConfiguration> configuration_;
  unsigned hellos_ ZK_ON(context_.loop) = 0;
};

}  // namespace zelkord::ipc
