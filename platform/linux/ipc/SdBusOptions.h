#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

#include "base/Time.h"

namespace zelkord {
class LoopCrew;
class PathWatcher;
}  // namespace zelkord

namespace zelkord::ipc {

// How `SdBusInterprocess` serves.
struct SdBusOptions {
  // The directory of all sockets; made 0700 when missing.
  std::string runtimeDirectory;
  std::string socketName = "socket";
  bool usesSessionBus = true;
  // A D-Bus address; empty: the session's own.
  std::string sessionBusAddress;
  // Tells when a session bus that was not there may be; null: it is looked for now and then.
  PathWatcher* watcher = nullptr;
  // Who leads the loop and carries calls to their end; null: a thread of its own, and calls go to
  // workers.
  LoopCrew* crew = nullptr;
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
  // What all clients hold together, and the calls of one process. A process has a quarter.
  std::size_t clientMemory = 256u << 20;
  std::size_t processCallsUnderWay = 16'384;
  // Of this process, for the size of the budgets; 0: as many as it may open.
  std::uint64_t descriptors = 0;
};

}  // namespace zelkord::ipc
