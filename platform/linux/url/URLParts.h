#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "base/Namespace.h"

namespace zelkord {

// What decides over an absolute URL: where it leads and how.
struct URLParts {
  std::string scheme;  // lower case
  std::string host;    // lower case; an IPv6 address in brackets; IPv4 addresses with four numbers
  std::string port;    // the scheme's own when the URL has none
  bool hasCredentials = false;

  bool isLoopback() const;
  // Whether both name the same host and port.
  bool sameEndpoint(const URLParts& other) const {
    return host == other.host && port == other.port;
  }
};

// None when the text is not an absolute URL of a scheme that can be loaded.
std::optional<URLParts> parseURL(const std::string& url);

// The URL without user name and password.
std::string withoutCredentials(const std::string& url);

// The URL that a reference in a document at `base` stands for; none when that is not a URL.
std::optional<std::string> resolveReference(const std::string& base, const std::string& reference);

}  // namespace zelkord
