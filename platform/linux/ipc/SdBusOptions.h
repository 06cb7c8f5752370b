#pragma once

#include <cstddef>
#include <string>

#include "base/Time.h"

namespace zelkord::ipc {

// How `SdBusInterprocess` serves.
struct SdBusOptions {
  // The directory of all sockets; made 0700 when missing.
  std::string runtimeDirectory;
  std::string socketName = "socket";
  bool usesSessionBus = true;
  // A D-Bus address; empty: the session's own.
  std::string sessionBusAddress;
  // Takes the first listening Unix socket that the service manager handed over, instead of making
  // one.
  bool usesHandedOverSocket = true;

  // From accept to the end of authentication; real time.
  Duration authenticationTimeout = 5s;
  // One incoming message on a private socket, headers included.
  std::size_t messageBytes = 4u << 20;
  // Unread messages of one client, besides the one that is being written and the largest other.
  std::size_t queuedBytes = 16u << 20;
  // Calls of one connection that are not answered yet.
  std::size_t callsUnderWay = 1024;
  std::size_t callBytesUnderWay = 16u << 20;
};

}  // namespace zelkord::ipc
