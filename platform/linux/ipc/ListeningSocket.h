#pragma once

#include <sys/types.h>

#include <optional>
#include <string>
#include <variant>

#include "base/Error.h"
#include "platform/linux/system/Descriptor.h"

namespace zelkord::ipc {

// A Unix socket that listens: made here and unlinked with its owner, or handed over by the service
// manager.
class ListeningSocket {
 public:
  // Makes the socket 0600, its directory 0700 when missing. A socket that nobody listens on any
  // more is replaced; one that is alive is an error (EADDRINUSE).
  static std::variant<ListeningSocket, Error> make(const std::string& path);
  // Removes the sockets in the directory on which nobody listens any more: that of the service, and
  // those with names of 32 hexadecimal digits. Others, and what is not ours, stay.
  static void removeDead(const std::string& directory, const std::string& serviceName);
  // The first listening Unix socket that this process was started with.
  static std::optional<ListeningSocket> handedOver();

  ListeningSocket(ListeningSocket&&) noexcept = default;
  ListeningSocket& operator=(ListeningSocket&&) = delete;
  ~ListeningSocket();

  int descriptor() const { return fd_.get(); }
  // Removes the name, unless another socket has it by now.
  void unlink();
  // "unix:path=…"
  static std::string address(const std::string& path);

 private:
  ListeningSocket(Descriptor fd, std::string path);

  Descriptor fd_;
  std::string path_;  // empty: not ours
  dev_t device_ = 0;
  ino_t inode_ = 0;
};

// The kernel's word on who made the other end.
struct SocketPeer {
  pid_t pid = 0;
  uid_t uid = 0;
};
std::optional<SocketPeer> peerOfSocket(int fd);

}  // namespace zelkord::ipc
