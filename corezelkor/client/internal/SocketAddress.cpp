#include "corezelkor/client/internal/SocketAddress.h"

#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "base/RuntimeDirectory.h"
#include "corezelkor/Constants.h"

namespace zelkor {
namespace {

bool standsForItself(char c) {
  return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') ||
         (c != '\0' && std::strchr("-_/.*", c));
}

}  // namespace

std::string addressOfSocket(const std::string& path) {
  constexpr const char* kDigits = "0123456789abcdef";
  std::string address = "unix:path=";
  for (const char c : path) {
    if (standsForItself(c)) {
      address += c;
    } else {
      const auto byte = static_cast<unsigned char>(c);
      address += '%';
      address += kDigits[byte >> 4];
      address += kDigits[byte & 15];
    }
  }
  return address;
}

std::vector<std::string> defaultSocketPaths() {
  std::vector<std::string> paths;
  for (const auto& directory : findRuntimeDirectories(RuntimeEnvironment::ofProcess())) {
    paths.push_back(directory + "/" + std::string(kServiceName) + "/socket");
  }
  return paths;
}

std::string problemWithPeer(int descriptor) {
  ucred peer{};
  socklen_t size = sizeof peer;
  if (::getsockopt(descriptor, SOL_SOCKET, SO_PEERCRED, &peer, &size) != 0) {
    return std::string("nobody knows who serves it: ") + std::strerror(errno);
  }
  if (peer.uid == ::geteuid()) return {};
  return "user " + std::to_string(peer.uid) + " serves it, not user " + std::to_string(::geteuid());
}

}  // namespace zelkor
