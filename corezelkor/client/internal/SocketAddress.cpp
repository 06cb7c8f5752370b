#include "corezelkor/client/internal/SocketAddress.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <cstring>

#include "corezelkor/Constants.h"

namespace zelkor {
namespace {

bool standsForItself(char c) {
  return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') ||
         (c != '\0' && std::strchr("-_/.*", c));
}

bool isOurDirectory(const std::string& path) {
  struct stat status {};
  return ::lstat(path.c_str(), &status) == 0 && S_ISDIR(status.st_mode) &&
         status.st_uid == ::getuid();
}

std::string absoluteVariableOr(const char* name, const std::string& otherwise) {
  const char* value = std::getenv(name);
  return value && value[0] == '/' ? value : otherwise;
}

std::string userRuntimeDirectory() {
  const auto user = std::to_string(::getuid());
  const auto usual = "/run/user/" + user;
  const auto temporary = absoluteVariableOr("TMPDIR", "/tmp") + "/zelkord-" + user;
  return absoluteVariableOr("XDG_RUNTIME_DIR", isOurDirectory(usual) ? usual : temporary);
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

std::string defaultSocketPath() {
  return userRuntimeDirectory() + "/" + std::string(kServiceName) + "/socket";
}

}  // namespace zelkor
