#include "benchmarks/process/floor/FloorDoor.h"

#include <sys/epoll.h>
#include <sys/socket.h>
#include <sys/un.h>

#include <utility>

namespace zelkord::bench {

void watchInput(int epoll, int descriptor) {
  epoll_event event{};
  event.events = EPOLLIN;
  event.data.fd = descriptor;
  ::epoll_ctl(epoll, EPOLL_CTL_ADD, descriptor, &event);
}

FloorDoor::FloorDoor(int epoll, const std::string& socketPath, Handler handler)
    : epoll_(epoll), handler_(std::move(handler)) {
  _listen(socketPath);
}

void FloorDoor::_listen(const std::string& socketPath) {
  listener_ = ::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0);
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  socketPath.copy(address.sun_path, sizeof address.sun_path - 1);
  ::bind(listener_, reinterpret_cast<const sockaddr*>(&address), sizeof address);
  ::listen(listener_, 256);
  watchInput(epoll_, listener_);
}

void FloorDoor::serve(sd_bus* bus) {
  sd_bus_add_filter(
      bus, nullptr,
      [](sd_bus_message* message, void* self, sd_bus_error*) {
        return static_cast<FloorDoor*>(self)->_handle(message);
      },
      this);
  const int descriptor = sd_bus_get_fd(bus);
  served_[descriptor] = {bus, EPOLLIN};
  watchInput(epoll_, descriptor);
  _process(bus);
}

void FloorDoor::_accept() {
  const int descriptor = ::accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK);
  if (descriptor < 0) return;
  sd_bus* bus = nullptr;
  sd_bus_new(&bus);
  sd_id128_t id{};
  sd_id128_randomize(&id);
  sd_bus_set_server(bus, 1, id);
  sd_bus_negotiate_fds(bus, 1);
  sd_bus_set_fd(bus, descriptor, descriptor);
  sd_bus_start(bus);
  serve(bus);
}

bool FloorDoor::ready(int descriptor) {
  if (descriptor == listener_) {
    _accept();
    return true;
  }
  const auto found = served_.find(descriptor);
  if (found == served_.end()) return false;
  _process(found->second.bus);
  return true;
}

int FloorDoor::_handle(sd_bus_message* message) {
  std::uint8_t type = 0;
  sd_bus_message_get_type(message, &type);
  if (type != SD_BUS_MESSAGE_METHOD_CALL) return 0;
  handler_(zelkor::MessagePointer(sd_bus_message_ref(message)));
  return 1;
}

void FloorDoor::send(zelkor::MessagePointer reply) {
  auto* bus = sd_bus_message_get_bus(reply.get());
  sd_bus_send(bus, reply.get(), nullptr);
  _updateMask(bus, sd_bus_get_fd(bus));  // what does not fit goes when there is room
}

void FloorDoor::_process(sd_bus* bus) {
  const int descriptor = sd_bus_get_fd(bus);
  int result = 1;
  while (result > 0) result = sd_bus_process(bus, nullptr);
  if (result >= 0) return _updateMask(bus, descriptor);
  served_.erase(descriptor);
  sd_bus_close_unref(bus);
}

void FloorDoor::_updateMask(sd_bus* bus, int descriptor) {
  const auto found = served_.find(descriptor);
  if (found == served_.end()) return;
  const auto wanted = static_cast<std::uint32_t>(sd_bus_get_events(bus));
  if (wanted == found->second.mask) return;
  epoll_event event{};
  event.events = found->second.mask = wanted;
  event.data.fd = descriptor;
  ::epoll_ctl(epoll_, EPOLL_CTL_MOD, descriptor, &event);
}

}  // namespace zelkord::bench
