#pragma once

#include <map>
#include <string>

#include "base/Time.h"

namespace zelkord {

// Which network interface has an address of this device: "eth0", never the address.
//
// The answer is the host's of the last minute; an address that was not there then is asked for
// again, at most once a second.
//
// Threading: none of its own. Errors: "" for an address that no interface has.
class InterfaceNames final {
 public:
  // `address`: as text, IPv4 or IPv6.
  std::string nameOf(const std::string& address, SteadyTime now);

 private:
  bool _isDue(bool isKnown, SteadyTime now) const;
  void _read(SteadyTime now);

  std::map<std::string, std::string> byAddress_;
  SteadyTime readAt_ = SteadyTime::min();
};

}  // namespace zelkord
