#include "platform/linux/url/InterfaceNames.h"

#include <arpa/inet.h>
#include <ifaddrs.h>
#include <netinet/in.h>

#include <array>
#include <memory>

namespace zelkord {
namespace {

constexpr Duration kReadAgainAfter = 60s;
constexpr Duration kReadAgainForUnknownAfter = 1s;

// "" for what is neither IPv4 nor IPv6.
std::string addressText(const sockaddr& address) {
  std::array<char, INET6_ADDRSTRLEN> text{};
  const void* bytes = nullptr;
  if (address.sa_family == AF_INET) {
    bytes = &reinterpret_cast<const sockaddr_in&>(address).sin_addr;
  } else if (address.sa_family == AF_INET6) {
    bytes = &reinterpret_cast<const sockaddr_in6&>(address).sin6_addr;
  }
  if (!bytes || !inet_ntop(address.sa_family, bytes, text.data(), text.size())) return "";
  return text.data();
}

}  // namespace

std::string InterfaceNames::nameOf(const std::string& address, SteadyTime now) {
  if (address.empty()) return "";
  if (_isDue(byAddress_.contains(address), now)) _read(now);
  const auto found = byAddress_.find(address);
  return found == byAddress_.end() ? "" : found->second;
}

bool InterfaceNames::_isDue(bool isKnown, SteadyTime now) const {
  if (readAt_ == SteadyTime::min()) return true;
  return now - readAt_ >= (isKnown ? kReadAgainAfter : kReadAgainForUnknownAfter);
}

void InterfaceNames::_read(SteadyTime now) {
  readAt_ = now;
  byAddress_.clear();
  ifaddrs* first = nullptr;
  if (getifaddrs(&first) != 0) return;
  const std::unique_ptr<ifaddrs, void (*)(ifaddrs*)> all(first, &freeifaddrs);
  for (const auto* entry = first; entry; entry = entry->ifa_next) {
    if (entry->ifa_addr) byAddress_.emplace(addressText(*entry->ifa_addr), entry->ifa_name);
  }
  byAddress_.erase("");
}

}  // namespace zelkord
