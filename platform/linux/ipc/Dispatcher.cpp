#include "platform/linux/ipc/Dispatcher.h"

#include <algorithm>
#include <utility>

#include "platform/linux/ipc/Introspection.h"

namespace zelkord::ipc {
namespace {

constexpr std::string_view kUnknownMethod = "org.freedesktop.DBus.Error.UnknownMethod";
constexpr std::string_view kUnknownObject = "org.freedesktop.DBus.Error.UnknownObject";
constexpr std::string_view kUnknownProperty = "org.freedesktop.DBus.Error.UnknownProperty";

std::string orEmpty(const char* text) { return text ? text : ""; }

const Method* methodOf(const Interface& interface, const std::string& member) {
  const auto found = std::find_if(interface.methods.begin(), interface.methods.end(),
                                  [&](const Method& method) { return method.name == member; });
  return found == interface.methods.end() ? nullptr : &*found;
}

std::shared_ptr<const ListenerConfiguration> withService(ListenerConfiguration configuration,
                                                         const std::string& serviceInterface) {
  if (!serviceInterface.empty()) {
    configuration.interfaces.push_back(
        {serviceInterface, {{.name = "Open", .out = "h connection"}}, {}});
  }
  return std::make_shared<const ListenerConfiguration>(std::move(configuration));
}

}  // namespace

Dispatcher::Dispatcher(IpcContext& context, ListenerConfiguration configuration,
                       std::string serviceInterface)
    : context_(context),
      serviceInterface_(std::move(serviceInterface)),
      configuration_(withService(std::move(configuration), serviceInterface_)) {}

void Dispatcher::dispatch(sd_bus_message* message, Caller& caller) {
  std::uint8_t type = 0;
  sd_bus_message_get_type(message, &type);
  if (type == SD_BUS_MESSAGE_METHOD_CALL) return dispatch(take(message), caller);
  noteMessage(caller);
}

TakenCall Dispatcher::take(sd_bus_message* message) const {
  context_.loop.assertCurrent();
  TakenCall call{.origin = originOf(message),
                 .path = orEmpty(sd_bus_message_get_path(message)),
                 .interface = orEmpty(sd_bus_message_get_interface(message)),
                 .member = orEmpty(sd_bus_message_get_member(message))};
  if (call.path == kObjectPath) _findMethod(call);
  if (call.method) {
    call.arguments = decodeArguments(message, call.method->in.signature, configuration_->limits);
  }
  return call;
}

void Dispatcher::_findMethod(TakenCall& call) const {
  for (const auto& candidate : configuration_->interfaces) {
    if (!call.interface.empty() && call.interface != candidate.name) continue;
    call.described = &candidate;
    call.method = methodOf(candidate, call.member);
    if (call.method) return;
  }
}

void Dispatcher::dispatch(TakenCall call, Caller& caller) {
  context_.loop.assertCurrent();
  if (!_dispatchCall(call, caller)) noteMessage(caller);
}

void Dispatcher::noteMessage(Caller& caller) {
  if (auto* connection = caller.connection()) connection->messageArrived();
}

bool Dispatcher::_dispatchCall(TakenCall& call, Caller& caller) {
  ++context_.counts->calls;
  if (caller.isPrivate() && _answerBusDriver(call, caller)) return false;
  if (_answerStandard(call, caller)) return false;
  if (call.path == kObjectPath) return _callObject(call, caller);
  refuse(caller.outlet(), call.origin, kUnknownObject, "no object at " + call.path);
  return false;
}

void Dispatcher::refuse(Outlet& outlet, const CallOrigin& origin, std::string_view error,
                        std::string_view text) {
  context_.loop.assertCurrent();
  ++context_.counts->refused;
  sendError(outlet, origin, error, text);
}

// There is no bus on a private connection, but tools begin with it.
bool Dispatcher::_answerBusDriver(const TakenCall& call, Caller& caller) {
  if (call.interface != "org.freedesktop.DBus") return false;
  if (call.member == "Hello") {
    sendReply(caller.outlet(), call.origin, "s", {":1." + std::to_string(++hellos_)});
  } else if (call.member == "AddMatch" || call.member == "RemoveMatch") {
    sendReply(caller.outlet(), call.origin, "", {});
  } else {
    refuse(caller.outlet(), call.origin, kUnknownMethod, "there is no bus on this connection");
  }
  return true;
}

bool Dispatcher::_answerStandard(const TakenCall& call, Caller& caller) {
  if (call.interface == "org.freedesktop.DBus.Introspectable") {
    if (call.member == "Introspect") {
      sendReply(caller.outlet(), call.origin, "s",
                {introspectionDocument(call.path, configuration_->interfaces)});
    } else {
      _refuseUnknown(call, caller);
    }
    return true;
  }
  if (call.interface != "org.freedesktop.DBus.Properties") return false;
  _answerProperties(call, caller);
  return true;
}

// No object has properties.
void Dispatcher::_answerProperties(const TakenCall& call, Caller& caller) {
  if (call.path != kObjectPath) {
    refuse(caller.outlet(), call.origin, kUnknownObject, "no object at " + call.path);
  } else if (call.member == "GetAll") {
    sendReply(caller.outlet(), call.origin, "a{sv}", {Dictionary{}});
  } else if (call.member == "Get" || call.member == "Set") {
    refuse(caller.outlet(), call.origin, kUnknownProperty, "there are no properties");
  } else {
    _refuseUnknown(call, caller);
  }
}

bool Dispatcher::_callObject(TakenCall& call, Caller& caller) {
  if (!call.method) {
    _refuseUnknown(call, caller);
    return false;
  }
  if (const auto* failure = std::get_if<DecodeFailure>(&call.arguments)) {
    _refuseArguments(call.origin, *failure, caller);
    return false;
  }
  if (call.described->name == serviceInterface_ && call.method->name == "Open") {
    _open(call.origin, caller);
    return false;
  }
  return _deliver(call.origin, *call.described, *call.method,
                  std::get<Decoded>(std::move(call.arguments)), caller);
}

void Dispatcher::_refuseArguments(const CallOrigin& origin, const DecodeFailure& failure,
                                  Caller& caller) {
  using Kind = DecodeFailure::Kind;
  // A bus lets texts through that sd-bus does not take for any, and its callers are not ours to cut
  // off.
  if (failure.kind == Kind::Malformed && caller.isPrivate()) return caller.cutOff(failure.text);
  refuse(caller.outlet(), origin, failure.kind == Kind::OverLimit ? kLimitsExceeded : kInvalidArgs,
         failure.text);
}

void Dispatcher::_refuseUnknown(const TakenCall& call, Caller& caller) {
  const bool isStandard = call.interface.starts_with("org.freedesktop.DBus.");
  const bool isInterface = isStandard || call.interface.empty() || _interface(call.interface);
  refuse(caller.outlet(), call.origin, isInterface ? kUnknownMethod : kUnknownInterface,
         "no method " + call.interface + "." + call.member);
}

bool Dispatcher::_deliver(const CallOrigin& origin, const Interface& interface,
                          const Method& method, Decoded decoded, Caller& caller) {
  const auto [receiver, error] = caller.receiver(interface.name);
  if (!receiver) {
    refuse(caller.outlet(), origin, error, "nobody can serve " + interface.name);
    return false;
  }
  auto share = receiver->flow()->take(decoded.bytes);
  if (!share) {
    refuse(caller.outlet(), origin, kLimitsExceeded, "too many calls under way");
    return false;
  }
  auto reply = std::make_shared<PendingReply>(
      receiver->route(), origin, std::shared_ptr<const Method>(configuration_, &method),
      *std::move(share));
  receiver->deliver({interface.name, method.name, std::move(decoded.values), std::move(reply)});
  return true;
}

void Dispatcher::_open(const CallOrigin& origin, Caller& caller) {
  if (!origin.wantsReply) return;
  auto handle = caller.openPrivateConnection();
  if (handle.descriptor() < 0) {
    return refuse(caller.outlet(), origin, kLimitsExceeded, "no connection can be made");
  }
  sendReply(caller.outlet(), origin, "h", {std::move(handle)});
}

const Interface* Dispatcher::_interface(const std::string& name) const {
  const auto& all = configuration_->interfaces;
  const auto found = std::find_if(
      all.begin(), all.end(), [&](const Interface& interface) { return interface.name == name; });
  return found == all.end() ? nullptr : &*found;
}

}  // namespace zelkord::ipc
