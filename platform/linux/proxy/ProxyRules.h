#pragma once

#include <memory>
#include <string>

#include "base/Json.h"
#include "platform/linux/url/ProxyConfiguration.h"

namespace zelkord {

// The proxy configuration {"proxy": "http(s)://host:port", "hosts": [host, ...]}, hosts in lower
// case. Null, with `problem` set, when it cannot be used; a host that is none is left out.
std::shared_ptr<const ProxyConfiguration> parseProxyConfiguration(const json::object& object,
                                                                  std::string* problem);

}  // namespace zelkord
