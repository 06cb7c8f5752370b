#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "base/Time.h"
#include "platform/linux/url/InterfaceNames.h"

namespace zelkord {

// What all transfers of a session have in common.
struct CurlSettings {
  std::string rootsFile;  // PEM; empty: the system's
  bool multiplexes = false;
  bool fastOpen = false;
  std::optional<bool> tlsSessionTickets;  // none: libcurl's default
  // How long idle connections are kept while the network is metered.
  Duration meteredIdleTime = 10s;
  long maximumIdleConnections = 32;
  std::function<bool()> isMetered;  // any thread, cheap
  std::shared_ptr<InterfaceNames> interfaces = std::make_shared<InterfaceNames>();  // the I/O loop
};

}  // namespace zelkord
