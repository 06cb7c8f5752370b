#pragma once

#include <functional>
#include <optional>
#include <string>

#include "base/Time.h"
#include "corezelkor/client/ClientTypes.h"

namespace zelkor {

// How a program talks to the daemon. Call-backs run on the client's thread and must not block it.
struct ClientOptions {
  // Sent first on every connection. With an empty identifier nothing is sent: enough for
  // diagnostics, while queries are never answered.
  ZLKSessionConfiguration configuration;

  // Where the daemon is; the first that is given counts. With none: asked for on the session bus,
  // which starts the daemon when needed, else the socket in the runtime directory.
  std::string address;     // a D-Bus address that serves the daemon's objects directly
  std::string socketPath;  // the same, as the path of a Unix socket
  std::string busAddress;  // of the bus to ask instead of the session's

  // Of every call, connecting included.
  Duration timeout = 60s;

  // After connecting, and whenever the bag changes. The error says why there is none.
  std::function<void(const std::optional<ClientBag>&, const std::optional<Error>&)> bagDidLoad;
  // The connection ended; the next call makes a new one.
  std::function<void()> disconnected;
};

}  // namespace zelkor
