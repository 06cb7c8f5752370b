#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "base/Namespace.h"

namespace zelkord {

// Where a URL leads, for decisions about whom to ask.
struct URLHost {
  std::string scheme;  // lower case
  std::string host;    // lower case, without a dot at its end; an IPv6 address in brackets

  bool isHTTP() const { return scheme == "http" || scheme == "https"; }

  // None for what is no absolute URL, and for every authority that two readers might understand
  // differently: user information, percent escapes, anything but letters, digits, "-", "." and "_"
  // in a name, a port that is none.
  static std::optional<URLHost> parse(std::string_view url);
};

}  // namespace zelkord
