#include "tests/soak/hostile/StalledHost.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include <stdexcept>

namespace zelkord::soak {

StalledHost::StalledHost() : listening_(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
  sockaddr_in address{};
  address.sin_family = AF_INET;
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  socklen_t length = sizeof(address);
  auto* plain = reinterpret_cast<sockaddr*>(&address);
  if (::bind(listening_, plain, length) != 0 || ::listen(listening_, 1024) != 0 ||
      ::getsockname(listening_, plain, &length) != 0) {
    throw std::runtime_error("no port to listen on");
  }
  url_ = "https://localhost:" + std::to_string(ntohs(address.sin_port));
  thread_ = std::thread([this] { _take(); });
}

StalledHost::~StalledHost() {
  ::shutdown(listening_, SHUT_RDWR);
  thread_.join();
  ::close(listening_);
  for (const int connection : taken_) ::close(connection);
}

void StalledHost::_take() {
  for (int connection = 0;
       (connection = ::accept4(listening_, nullptr, nullptr, SOCK_CLOEXEC)) >= 0;) {
    taken_.push_back(connection);
    // Those that have given up make room.
    char byte = 0;
    std::erase_if(taken_, [&](int held) {
      if (::recv(held, &byte, 1, MSG_DONTWAIT | MSG_PEEK) != 0) return false;
      ::close(held);
      return true;
    });
  }
}

}  // namespace zelkord::soak
