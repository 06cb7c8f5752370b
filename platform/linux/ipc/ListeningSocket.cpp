#include "platform/linux/ipc/ListeningSocket.h"

#include <fcntl.h>
#include <fmt/format.h>
#include <sys/file.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <systemd/sd-daemon.h>

#include <cerrno>
#include <chrono>
#include <cstring>
#include <filesystem>
#include <thread>
#include <utility>

namespace zelkord::ipc {
namespace {

constexpr int kSocketBacklog = SOMAXCONN;  // clients do not wait for a place
constexpr int kLockAttempts = 100;
constexpr auto kLockPause = std::chrono::milliseconds(5);

std::optional<sockaddr_un> unixAddress(const std::string& path) {
  sockaddr_un address{.sun_family = AF_UNIX, .sun_path = {}};
  if (path.size() >= sizeof(address.sun_path)) return std::nullopt;
  std::memcpy(address.sun_path, path.data(), path.size());
  return address;
}

const sockaddr* genericAddress(const sockaddr_un& address) {
  return reinterpret_cast<const sockaddr*>(&address);
}

Descriptor makeUnixSocket() {
  return Descriptor(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
}

// Keeps others from taking a socket that is bound and does not listen yet for a dead one. Gives up
// when somebody keeps the lock for long.
Descriptor lockDirectory(const std::string& directory) {
  Descriptor lock(::open(directory.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  for (int i = 0; i < kLockAttempts && ::flock(lock.get(), LOCK_EX | LOCK_NB) != 0; ++i) {
    if (errno != EWOULDBLOCK) break;
    std::this_thread::sleep_for(kLockPause);
  }
  return lock;
}

// Whether the name belongs to a socket of ours that a dead process left.
bool isStaleSocket(const std::string& path, const sockaddr_un& address) {
  struct stat status {};
  if (::lstat(path.c_str(), &status) != 0 || !S_ISSOCK(status.st_mode)) return false;
  if (status.st_uid != ::geteuid()) return false;
  const auto probe = makeUnixSocket();
  return ::connect(probe.get(), genericAddress(address), sizeof(address)) != 0 &&
         errno == ECONNREFUSED;
}

bool isAnonymousName(const std::string& name) {
  return name.size() == 32 && name.find_first_not_of("0123456789abcdef") == std::string::npos;
}

// Zero or an errno.
int bindAndListen(int fd, const std::string& path, const sockaddr_un& address) {
  // The mode of the descriptor becomes that of the name, so that it is never wider.
  if (::fchmod(fd, 0600) != 0) return errno;
  int r = ::bind(fd, genericAddress(address), sizeof(address));
  if (r != 0 && errno == EADDRINUSE && isStaleSocket(path, address)) {
    ::unlink(path.c_str());
    r = ::bind(fd, genericAddress(address), sizeof(address));
  }
  if (r != 0 || ::listen(fd, kSocketBacklog) != 0) return errno;
  return 0;
}

void makePrivateDirectory(const std::filesystem::path& directory) {
  std::error_code ignored;  // bind tells
  std::filesystem::create_directories(directory.parent_path(), ignored);
  ::mkdir(directory.c_str(), 0700);
}

}  // namespace

std::variant<ListeningSocket, Error> ListeningSocket::make(const std::string& path) {
  const auto address = unixAddress(path);
  if (!address) return posixError(ENAMETOOLONG);
  const auto directory = std::filesystem::path(path).parent_path();
  makePrivateDirectory(directory);
  const auto lock = lockDirectory(directory);
  auto fd = makeUnixSocket();
  if (!fd) return posixError(errno);
  if (const int number = bindAndListen(fd.get(), path, *address)) return posixError(number);
  return ListeningSocket(std::move(fd), path);
}

void ListeningSocket::removeDead(const std::string& directory, const std::string& serviceName) {
  const auto lock = lockDirectory(directory);
  std::error_code ignored;
  for (const auto& entry : std::filesystem::directory_iterator(directory, ignored)) {
    const auto name = entry.path().filename().string();
    if (name != serviceName && !isAnonymousName(name)) continue;
    const auto address = unixAddress(entry.path());
    if (address && isStaleSocket(entry.path(), *address)) ::unlink(entry.path().c_str());
  }
}

std::optional<ListeningSocket> ListeningSocket::handedOver() {
  const int count = sd_listen_fds(0);
  for (int fd = SD_LISTEN_FDS_START; fd < SD_LISTEN_FDS_START + count; ++fd) {
    if (sd_is_socket(fd, AF_UNIX, SOCK_STREAM, 1) <= 0) continue;
    ::fcntl(fd, F_SETFL, ::fcntl(fd, F_GETFL) | O_NONBLOCK);
    return ListeningSocket(Descriptor(fd), {});
  }
  return std::nullopt;
}

ListeningSocket::ListeningSocket(Descriptor fd, std::string path)
    : fd_(std::move(fd)), path_(std::move(path)) {
  struct stat status {};
  if (::stat(path_.c_str(), &status) != 0) return;
  device_ = status.st_dev;
  inode_ = status.st_ino;
}

ListeningSocket::~ListeningSocket() { unlink(); }

void ListeningSocket::unlink() {
  const auto path = std::exchange(path_, {});
  struct stat status {};
  if (path.empty() || ::stat(path.c_str(), &status) != 0) return;
  if (status.st_dev == device_ && status.st_ino == inode_) ::unlink(path.c_str());
}

std::string ListeningSocket::address(const std::string& path) {
  constexpr std::string_view kPlain =
      "-_/.\\*0123456789ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz";
  std::string address = "unix:path=";
  for (const char c : path) {
    const bool plain = kPlain.find(c) != std::string_view::npos;
    address += plain ? std::string(1, c) : fmt::format("%{:02x}", static_cast<unsigned char>(c));
  }
  return address;
}

std::optional<SocketPeer> peerOfSocket(int fd) {
  ucred credentials{};
  socklen_t size = sizeof(credentials);
  if (::getsockopt(fd, SOL_SOCKET, SO_PEERCRED, &credentials, &size) != 0) return std::nullopt;
  return SocketPeer{credentials.pid, credentials.uid};
}

}  // namespace zelkord::ipc
