#include "platform/linux/ipc/Introspection.h"

#include <fmt/format.h>

#include "platform/linux/ipc/WireDecoding.h"

namespace zelkord::ipc {
namespace {

constexpr std::string_view kIntrospectionHead =
    "<!DOCTYPE node PUBLIC \"-//freedesktop//DTD D-BUS Object Introspection 1.0//EN\"\n"
    " \"http://www.freedesktop.org/standards/dbus/1.0/introspect.dtd\">\n<node>\n";

constexpr std::string_view kStandardInterfaces =
    " <interface name=\"org.freedesktop.DBus.Peer\">\n"
    "  <method name=\"Ping\"/>\n"
    "  <method name=\"GetMachineId\"><arg type=\"s\" direction=\"out\"/></method>\n"
    " </interface>\n"
    " <interface name=\"org.freedesktop.DBus.Introspectable\">\n"
    "  <method name=\"Introspect\"><arg type=\"s\" direction=\"out\"/></method>\n"
    " </interface>\n";

// Nothing for an empty value.
std::string attribute(std::string_view name, std::string_view value) {
  return value.empty() ? std::string() : fmt::format(" {}=\"{}\"", name, value);
}

void appendIntrospectedArguments(std::string& xml, const Arguments& arguments,
                                 std::string_view direction) {
  std::string_view types = arguments.signature;
  for (auto name = arguments.names.begin(); !types.empty();) {
    const auto type = firstCompleteType(types);
    types.remove_prefix(type.size());
    xml += "   <arg";
    if (name != arguments.names.end()) xml += attribute("name", *name++);
    xml += attribute("type", type) + attribute("direction", direction) + "/>\n";
  }
}

void appendIntrospectedInterface(std::string& xml, const Interface& interface) {
  xml += " <interface name=\"" + interface.name + "\">\n";
  for (const auto& method : interface.methods) {
    xml += "  <method name=\"" + method.name + "\">\n";
    appendIntrospectedArguments(xml, method.in, "in");
    appendIntrospectedArguments(xml, method.out, "out");
    if (method.noReply) {
      xml += "   <annotation name=\"org.freedesktop.DBus.Method.NoReply\" value=\"true\"/>\n";
    }
    xml += "  </method>\n";
  }
  for (const auto& [name, arguments] : interface.signals) {
    xml += "  <signal name=\"" + name + "\">\n";
    appendIntrospectedArguments(xml, arguments, "");
    xml += "  </signal>\n";
  }
  xml += " </interface>\n";
}

// The step after `path` on the way to the object; empty when `path` is not above it.
std::string_view childOnTheWay(std::string_view path) {
  auto rest = kObjectPath;
  if (path == "/") path = "";
  if (!rest.starts_with(path)) return {};
  rest.remove_prefix(path.size());
  if (!rest.starts_with('/')) return {};
  rest.remove_prefix(1);
  return rest.substr(0, rest.find('/'));
}

}  // namespace

std::string introspectionDocument(std::string_view path, const std::vector<Interface>& interfaces) {
  std::string xml(kIntrospectionHead);
  if (path == kObjectPath) {
    xml += kStandardInterfaces;
    for (const auto& interface : interfaces) appendIntrospectedInterface(xml, interface);
  } else if (const auto child = childOnTheWay(path); !child.empty()) {
    xml += " <node name=\"" + std::string(child) + "\"/>\n";
  }
  return xml + "</node>\n";
}

}  // namespace zelkord::ipc
