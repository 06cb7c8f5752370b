#include "platform/linux/ipc/SocketAdoption.h"

#include <fcntl.h>
#include <sys/eventfd.h>
#include <sys/socket.h>
#include <systemd/sd-id128.h>

#include <string_view>
#include <utility>

namespace zelkord::ipc {
namespace {

constexpr int kSocketBufferBytes = 1 << 20;  // the kernel cuts it to what it allows

BusPtr startServer(Descriptor fd, bool passesDescriptors) {
  sd_bus* bus = nullptr;
  sd_id128_t id{};
  if (sd_bus_new(&bus) < 0) return nullptr;
  BusPtr owned(bus);
  sd_id128_randomize(&id);
  if (sd_bus_set_fd(bus, fd.get(), fd.get()) < 0) return nullptr;
  fd.release();
  if (sd_bus_set_server(bus, 1, id) < 0 || sd_bus_negotiate_fds(bus, passesDescriptors) < 0 ||
      sd_bus_start(bus) < 0) {
    return nullptr;
  }
  return owned;
}

bool authenticateAsClient(sd_bus* bus, int fd, bool passesDescriptors) {
  using namespace std::string_view_literals;
  const auto words = passesDescriptors
                         ? "\0AUTH EXTERNAL\r\nDATA\r\nNEGOTIATE_UNIX_FD\r\nBEGIN\r\n"sv
                         : "\0AUTH EXTERNAL\r\nDATA\r\nBEGIN\r\n"sv;
  if (::send(fd, words.data(), words.size(), MSG_NOSIGNAL) < 0) return false;
  for (int round = 0; round < 16 && sd_bus_is_ready(bus) == 0; ++round) {
    if (sd_bus_process(bus, nullptr) < 0) return false;
  }
  return sd_bus_is_ready(bus) > 0;
}

bool makeReadNoDescriptors(sd_bus* bus) {
  const Descriptor noSocket(::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK));
  return noSocket && ::dup3(noSocket.get(), sd_bus_get_fd(bus), O_CLOEXEC) >= 0 &&
         sd_bus_process(bus, nullptr) == 0;
}

}  // namespace

BusPtr adoptSocket(Descriptor& socket, bool passesDescriptors) {
  int pair[2];
  if (::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0, pair) != 0)
    return nullptr;
  Descriptor client(pair[0]);
  auto bus = startServer(Descriptor(pair[1]), passesDescriptors);
  if (!bus || !authenticateAsClient(bus.get(), client.get(), passesDescriptors)) return nullptr;
  client.reset();
  if (!makeReadNoDescriptors(bus.get())) return nullptr;
  ::setsockopt(socket.get(), SOL_SOCKET, SO_SNDBUF, &kSocketBufferBytes,
               sizeof(kSocketBufferBytes));
  ::fcntl(socket.get(), F_SETFL, ::fcntl(socket.get(), F_GETFL) | O_NONBLOCK);
  if (::dup3(socket.get(), sd_bus_get_fd(bus.get()), O_CLOEXEC) < 0) return nullptr;
  socket.reset();
  return bus;
}

}  // namespace zelkord::ipc
