#pragma once

#include <algorithm>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/api/Interprocess.h"

namespace zelkord {

// When a call is handled, seen from the others of its connection.
enum class CallTurn {
  InOrder,   // behind those that wait for a bag
  AfterBag,  // the same, and it waits for a bag itself
  Ahead,     // at once
};

// A member of an interface: what callers see of it, and what handles it.
template <typename Handler>
struct Member {
  ipc::Method method;
  void (Handler::*handle)(const ipc::Call& call);
  CallTurn turn = CallTurn::InOrder;
};

// An interface as the rows of its members. What each means is in
// corezelkor/dbus/com.quenta.zelkord.xml.
template <typename Handler>
struct ServedInterface {
  std::string_view name;
  std::vector<Member<Handler>> members;
  std::vector<std::pair<std::string, ipc::Arguments>> signals = {};

  // As the transport needs it.
  ipc::Interface description() const {
    ipc::Interface described{std::string(name), {}, signals};
    for (const auto& member : members) described.methods.push_back(member.method);
    return described;
  }

  // Null for a call of another interface.
  const Member<Handler>* find(const ipc::Call& call) const {
    if (call.interface != name) return nullptr;
    const auto found = std::ranges::find_if(
        members, [&](const auto& member) { return member.method.name == call.member; });
    return found == members.end() ? nullptr : &*found;
  }
};

}  // namespace zelkord
