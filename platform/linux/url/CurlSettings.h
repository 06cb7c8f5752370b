#pragma once

#include <functional>
#include <optional>
#include <string>

#include "base/Time.h"

namespace zelkord {

// What all transfers of a session have in common.
struct CurlSettings {
  std::string rootsFile;  // PEM; empty: the system's
  bool multiplexes = false;
  bool fastOpen = false;
  std::optional<bool> tlsSessionTickets;  // none: libcurl's default
  // How long idle connections are kept while the network is metered.
  Duration meteredIdleTime = 10s;
  std::function<bool()> isMetered;  // any thread, cheap
};

}  // namespace zelkord
