#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

#include "platform/api/Interprocess.h"
#include "platform/linux/ipc/BusPointers.h"

namespace zelkord::ipc {

// Where the messages for one client leave.
// Threading: the loop.
class Outlet {
 public:
  virtual ~Outlet() = default;
  // What messages are made with; null once nothing can be sent.
  virtual sd_bus* bus() = 0;
  // The client's name on the bus; empty on a private connection.
  virtual const std::string& destination() const = 0;
  // `bytes` is what the message holds, roughly.
  virtual void send(MessagePtr message, std::size_t bytes) = 0;
  // Ends the client's connection from our side.
  virtual void invalidate() = 0;
};

// What a call needs for its answer; the message itself is gone by then.
struct CallOrigin {
  std::uint64_t cookie = 0;
  bool wantsReply = false;
};
CallOrigin originOf(sd_bus_message* call);

// Each does nothing when the outlet has ended, or nobody wants the reply.
// Zero, or a negative errno when the values make no message: the caller then gets an error instead.
int sendReply(Outlet& outlet, const CallOrigin& origin, std::string_view signature,
              const Values& values);
void sendError(Outlet& outlet, const CallOrigin& origin, std::string_view name,
               std::string_view text);
int sendCall(Outlet& outlet, const std::string& path, const std::string& interface,
             const std::string& member, std::string_view signature, const Values& values);

}  // namespace zelkord::ipc
