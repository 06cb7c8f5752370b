#include "zelkord/network/exchange/URLHost.h"

#include <algorithm>

#include "zelkord/network/exchange/URLComponents.h"

namespace zelkord {
namespace {

constexpr std::size_t kMaximumHostLength = 255;
constexpr unsigned kMaximumPort = 65535;

constexpr std::string_view kInAddress = "0123456789abcdef:.";
constexpr std::string_view kInName = "abcdefghijklmnopqrstuvwxyz0123456789-._";

std::string asciiLowerCase(std::string_view text) {
  std::string lower(text);
  for (char& c : lower) c = c >= 'A' && c <= 'Z' ? static_cast<char>(c + 32) : c;
  return lower;
}

bool hasOnly(std::string_view text, std::string_view allowed) {
  return text.find_first_not_of(allowed) == std::string_view::npos;
}

// What follows the host: nothing, or a colon and a number.
bool isPort(std::string_view text) {
  if (text.empty()) return true;
  if (text.front() != ':' || text.size() > 6 || !hasOnly(text.substr(1), "0123456789")) {
    return false;
  }
  unsigned port = 0;
  for (const char c : text.substr(1)) port = port * 10 + static_cast<unsigned>(c - '0');
  return port <= kMaximumPort;
}

bool isName(std::string_view host) {
  return !host.empty() && host.front() != '.' && host.size() <= kMaximumHostLength &&
         host.find("..") == std::string_view::npos && hasOnly(host, kInName);
}

// `authority` in lower case.
std::optional<std::string> hostIn(std::string_view authority) {
  const bool isAddress = authority.starts_with('[');
  const auto end =
      isAddress ? authority.find(']') : std::min(authority.find(':'), authority.size());
  if (end == std::string_view::npos) return std::nullopt;
  auto host = authority.substr(0, isAddress ? end + 1 : end);
  if (!isPort(authority.substr(host.size()))) return std::nullopt;
  if (isAddress) {
    const auto address = host.substr(1, host.size() - 2);
    if (address.size() < 2 || !hasOnly(address, kInAddress)) return std::nullopt;
  } else {
    if (host.ends_with('.')) host.remove_suffix(1);
    if (!isName(host) || host.ends_with('.')) return std::nullopt;
  }
  return std::string(host);
}

}  // namespace

std::optional<URLHost> URLHost::parse(std::string_view url) {
  const auto components = URLComponents::parse(url);
  if (!components) return std::nullopt;
  const std::string_view base = components->base;
  const auto colon = base.find(':');
  const auto authority = base.substr(colon + 3);
  auto host = hostIn(asciiLowerCase(authority.substr(0, authority.find('/'))));
  if (!host) return std::nullopt;
  return URLHost{asciiLowerCase(base.substr(0, colon)), *std::move(host)};
}

}  // namespace zelkord
