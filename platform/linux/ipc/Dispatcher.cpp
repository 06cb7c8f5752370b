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
    configuration.interfaces.push_back({serviceInterface, {{.name = "Open", .out = "h"}}, {}});
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
  if (type == SD_BUS_MESSAGE_METHOD_CALL && _dispatchCall(message, caller)) return;
  noteMessage(caller);
}

void Dispatcher::noteMessage(Caller& caller) {
  if (auto* connection = caller.connection()) connection->messageArrived();
}

bool Dispatcher::_dispatchCall(sd_bus_message* message, Caller& caller) {
  ++context_.counts->calls;
  const Target target{orEmpty(sd_bus_message_get_path(message)),
                      orEmpty(sd_bus_message_get_interface(message)),
                      orEmpty(sd_bus_message_get_member(message))};
  if (caller.isPrivate() && _answerBusDriver(message, target, caller)) return false;
  if (_answerStandard(message, target, caller)) return false;
  if (target.path == kObjectPath) return _callObject(message, target, caller);
  refuse(caller.outlet(), originOf(message), kUnknownObject, "no object at " + target.path);
  return false;
}

void Dispatcher::refuse(Outlet& outlet, const CallOrigin& origin, std::string_view error,
                        std::string_view text) {
  ++context_.counts->refused;
  sendError(outlet, origin, error, text);
}

// There is no bus on a private connection, but tools begin with it.
bool Dispatcher::_answerBusDriver(sd_bus_message* message, const Target& target, Caller& caller) {
  if (target.interface != "org.freedesktop.DBus") return false;
  const auto origin = originOf(message);
  if (target.member == "Hello") {
    sendReply(caller.outlet(), origin, "s", {":1." + std::to_string(++hellos_)});
  } else if (target.member == "AddMatch" || target.member == "RemoveMatch") {
    sendReply(caller.outlet(), origin, "", {});
  } else {
    refuse(caller.outlet(), origin, kUnknownMethod, "there is no bus on this connection");
  }
  return true;
}

bool Dispatcher::_answerStandard(sd_bus_message* message, const Target& target, Caller& caller) {
  if (target.interface == "org.freedesktop.DBus.Introspectable") {
    if (target.member == "Introspect") {
      sendReply(caller.outlet(), originOf(message), "s",
                {introspectionDocument(target.path, configuration_->interfaces)});
    } else {
      _refuseUnknown(originOf(message), target, caller);
    }
    return true;
  }
  if (target.interface != "org.freedesktop.DBus.Properties") return false;
  _answerProperties(message, target, caller);
  return true;
}

// No object has properties.
void Dispatcher::_answerProperties(sd_bus_message* message, const Target& target, Caller& caller) {
  const auto origin = originOf(message);
  if (target.path != kObjectPath) {
    refuse(caller.outlet(), origin, kUnknownObject, "no object at " + target.path);
  } else if (target.member == "GetAll") {
    sendReply(caller.outlet(), origin, "a{sv}", {Dictionary{}});
  } else if (target.member == "Get" || target.member == "Set") {
    refuse(caller.outlet(), origin, kUnknownProperty, "there are no properties");
  } else {
    _refuseUnknown(origin, target, caller);
  }
}

bool Dispatcher::_callObject(sd_bus_message* message, const Target& target, Caller& caller) {
  const auto origin = originOf(message);
  const Interface* interface = _interface(target.interface);
  const Method* method = interface ? methodOf(*interface, target.member) : nullptr;
  if (target.interface.empty()) {
    for (const auto& candidate : configuration_->interfaces) {
      if ((method = methodOf(candidate, target.member))) {
        interface = &candidate;
        break;
      }
    }
  }
  if (!method) {
    _refuseUnknown(origin, target, caller);
    return false;
  }
  auto outcome = decodeArguments(message, method->in, configuration_->limits);
  if (const auto* failure = std::get_if<DecodeFailure>(&outcome)) {
    _refuseArguments(origin, *failure, caller);
    return false;
  }
  if (interface->name == serviceInterface_ && method->name == "Open") {
    _open(origin, caller);
    return false;
  }
  return _deliver(origin, *interface, *method, std::get<Decoded>(std::move(outcome)), caller);
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

void Dispatcher::_refuseUnknown(const CallOrigin& origin, const Target& target, Caller& caller) {
  const bool isStandard = target.interface.starts_with("org.freedesktop.DBus.");
  const bool isInterface = isStandard || target.interface.empty() || _interface(target.interface);
  refuse(caller.outlet(), origin, isInterface ? kUnknownMethod : kUnknownInterface,
         "no method " + target.interface + "." + target.member);
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
