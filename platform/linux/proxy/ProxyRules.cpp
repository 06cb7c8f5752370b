#include "platform/linux/proxy/ProxyRules.h"

#include <algorithm>
#include <string_view>

namespace zelkord {
namespace {

constexpr std::size_t kMaximumProxyHosts = 1000;

bool isHostCharacter(char c) {
  return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '-' ||
         c == '.' || c == '_';
}

bool isProxyHost(std::string_view host) {
  return !host.empty() && host.size() <= 253 &&
         std::all_of(host.begin(), host.end(), isHostCharacter);
}

// "[...]" with what an IPv6 address is written with.
bool isBracketedAddress(std::string_view text) {
  return text.size() > 2 && text.front() == '[' && text.back() == ']' &&
         text.find_first_not_of("0123456789abcdefABCDEF:.", 1) == text.size() - 1;
}

bool isPort(std::string_view text) {
  if (text.empty() || text.size() > 5 ||
      text.find_first_not_of("0123456789") != std::string_view::npos) {
    return false;
  }
  const int port = std::stoi(std::string(text));
  return port >= 1 && port <= 65535;
}

bool isProxyAddress(std::string_view text) {
  const auto scheme = text.find("://");
  if (scheme == std::string_view::npos) return false;
  if (text.substr(0, scheme) != "http" && text.substr(0, scheme) != "https") return false;
  text.remove_prefix(scheme + 3);
  if (text.ends_with('/')) text.remove_suffix(1);
  const auto colon = text.rfind(':');
  if (colon == std::string_view::npos || !isPort(text.substr(colon + 1))) return false;
  const auto host = text.substr(0, colon);
  return isProxyHost(host) || isBracketedAddress(host);
}

std::string asciiLowered(std::string_view text) {
  std::string lowered(text);
  for (char& c : lowered) {
    if (c >= 'A' && c <= 'Z') c = static_cast<char>(c + 32);
  }
  return lowered;
}

}  // namespace

std::shared_ptr<const ProxyConfiguration> parseProxyConfiguration(const json::object& object,
                                                                  std::string* problem) {
  const auto refuse = [problem](const char* text) {
    *problem = text;
    return nullptr;
  };
  auto proxy = stringIn(object, "proxy");
  if (!proxy || !isProxyAddress(*proxy)) return refuse("\"proxy\" is no http(s)://host:port");
  const auto* hosts = arrayIn(object, "hosts");
  if (!hosts || hosts->size() > kMaximumProxyHosts) return refuse("\"hosts\" is no list of hosts");
  auto configuration = std::make_shared<ProxyConfiguration>();
  if (proxy->ends_with('/')) proxy->pop_back();
  configuration->proxy = std::move(*proxy);
  for (const auto& host : *hosts) {
    if (host.is_string() && isProxyHost(host.get_string())) {
      configuration->hosts.push_back(asciiLowered(host.get_string()));
    }
  }
  if (configuration->hosts.empty()) return refuse("\"hosts\" names no host");
  return configuration;
}

}  // namespace zelkord
