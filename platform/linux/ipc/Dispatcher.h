#pragma once

#include <systemd/sd-bus.h>

#include <memory>
#include <string>

#include "platform/api/Interprocess.h"
#include "platform/linux/ipc/IpcContext.h"
#include "platform/linux/ipc/Outlet.h"
#include "platform/linux/ipc/ServedConnection.h"
#include "platform/linux/ipc/WireDecoding.h"

namespace zelkord::ipc {

// Who made a call, as its door knows it.
// Threading: the loop.
class Caller {
 public:
  virtual ~Caller() = default;
  virtual Outlet& outlet() = 0;
  // Who gets the calls of that interface; null: nobody.
  virtual std::shared_ptr<ServedConnection> receiver(const std::string& interface) = 0;
  // A new private connection for the caller; an invalid handle when there is none to be had.
  virtual FileHandle openPrivateConnection() = 0;
  // Not the user we serve, or a message that cannot be one.
  virtual void cutOff(const std::string& reason) = 0;
  virtual bool isPrivate() const = 0;
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
  // Answers with an error of the transport itself.
  void refuse(Outlet& outlet, const CallOrigin& origin, std::string_view error,
              std::string_view text);

 private:
  struct Target {
    std::string path;
    std::string interface;  // empty: any that has the member
    std::string member;
  };

  bool _answerBusDriver(sd_bus_message* message, const Target& target, Caller& caller);
  bool _answerStandard(sd_bus_message* message, const Target& target, Caller& caller);
  void _answerProperties(sd_bus_message* message, const Target& target, Caller& caller);
  void _callObject(sd_bus_message* message, const Target& target, Caller& caller);
  void _refuseUnknown(const CallOrigin& origin, const Target& target, Caller& caller);
  void _deliver(const CallOrigin& origin, const Interface& interface, const Method& method,
                Decoded decoded, Caller& caller);
  void _open(const CallOrigin& origin, Caller& caller);
  const Interface* _interface(const std::string& name) const;

  IpcContext& context_;
  const std::string serviceInterface_;
  const std::shared_ptr<const ListenerConfiguration> configuration_;
  unsigned hellos_ = 0;
};

}  // namespace zelkord::ipc
