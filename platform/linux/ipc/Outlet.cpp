#include "platform/linux/ipc/Outlet.h"

#include <cerrno>
#include <cstring>
#include <utility>

#include "platform/linux/ipc/WireEncoding.h"

namespace zelkord::ipc {
namespace {

// sd-bus makes a reply only from the call it answers. A stand-in with the call's number saves
// keeping every call, with its arguments, until it is answered.
MessagePtr makeStandIn(Outlet& outlet, const CallOrigin& origin) {
  sd_bus_message* call = nullptr;
  if (sd_bus_message_new_method_call(outlet.bus(), &call, nullptr, "/", nullptr, "Call") < 0) {
    return nullptr;
  }
  MessagePtr owned(call);
  if (!outlet.destination().empty() &&
      sd_bus_message_set_sender(call, outlet.destination().c_str()) < 0) {
    return nullptr;
  }
  if (sd_bus_message_seal(call, origin.cookie, 0) < 0) return nullptr;
  return owned;
}

bool canAnswer(Outlet& outlet, const CallOrigin& origin) {
  return origin.wantsReply && outlet.bus() != nullptr;
}

}  // namespace

CallOrigin originOf(sd_bus_message* call) {
  CallOrigin origin;
  sd_bus_message_get_cookie(call, &origin.cookie);
  origin.wantsReply = sd_bus_message_get_expect_reply(call) > 0;
  return origin;
}

int sendReply(Outlet& outlet, const CallOrigin& origin, std::string_view signature,
              const Values& values) {
  if (!canAnswer(outlet, origin)) return 0;
  if (signature.find('h') != std::string_view::npos && sd_bus_can_send(outlet.bus(), 'h') <= 0) {
    sendError(outlet, origin, "org.freedesktop.DBus.Error.NotSupported",
              "the connection passes no file descriptors");
    return 0;
  }
  const auto call = makeStandIn(outlet, origin);
  sd_bus_message* reply = nullptr;
  int r = call ? sd_bus_message_new_method_return(call.get(), &reply) : -ENOMEM;
  MessagePtr owned(reply);
  if (r >= 0) r = encodeValues(reply, signature, values);
  if (r >= 0) {
    outlet.send(std::move(owned), encodedSize(values));
    return 0;
  }
  sendError(outlet, origin, "org.freedesktop.DBus.Error.Failed", "the reply makes no message");
  return r;
}

void sendError(Outlet& outlet, const CallOrigin& origin, std::string_view name,
               std::string_view text) {
  if (!canAnswer(outlet, origin)) return;
  const auto call = makeStandIn(outlet, origin);
  if (!call) return;
  const std::string errorName(name);
  const auto errorText = wireText(text);
  const sd_bus_error error{errorName.c_str(), errorText.c_str(), 0};
  sd_bus_message* reply = nullptr;
  if (sd_bus_message_new_method_error(call.get(), &reply, &error) < 0) return;
  outlet.send(MessagePtr(reply), 256 + text.size());
}

int sendCall(Outlet& outlet, const std::string& path, const std::string& interface,
             const std::string& member, std::string_view signature, const Values& values) {
  if (!outlet.bus()) return -ENOTCONN;
  const auto& destination = outlet.destination();
  sd_bus_message* call = nullptr;
  int r = sd_bus_message_new_method_call(outlet.bus(), &call,
                                         destination.empty() ? nullptr : destination.c_str(),
                                         path.c_str(), interface.c_str(), member.c_str());
  MessagePtr owned(call);
  if (r >= 0) r = sd_bus_message_set_expect_reply(call, 0);
  if (r >= 0) r = encodeValues(call, signature, values);
  if (r < 0) return r;
  outlet.send(std::move(owned), encodedSize(values));
  return 0;
}

}  // namespace zelkord::ipc
