#include "benchmarks/process/floor/FloorService.h"

#include <sys/epoll.h>
#include <sys/socket.h>
#include <sys/un.h>

#include <array>
#include <string_view>

namespace zelkord::bench {

FloorService::FloorService(const std::string& socketPath, sd_bus* bus, std::size_t bodySize)
    : epoll_(::epoll_create1(EPOLL_CLOEXEC)), body_(bodySize, 'p') {
  _listen(socketPath);
  _watch(listener_);
  _watch(worker_.wakeUp());
  if (bus) _serve(bus);
}

void FloorService::_listen(const std::string& socketPath) {
  listener_ = ::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0);
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  socketPath.copy(address.sun_path, sizeof address.sun_path - 1);
  ::bind(listener_, reinterpret_cast<const sockaddr*>(&address), sizeof address);
  ::listen(listener_, 256);
}

void FloorService::_watch(int descriptor) const {
  epoll_event event{};
  event.events = EPOLLIN;
  event.data.fd = descriptor;
  ::epoll_ctl(epoll_, EPOLL_CTL_ADD, descriptor, &event);
}

void FloorService::_serve(sd_bus* bus) {
  sd_bus_add_filter(
      bus, nullptr,
      [](sd_bus_message* message, void* self, sd_bus_error*) {
        return static_cast<FloorService*>(self)->_handle(message);
      },
      this);
  const int descriptor = sd_bus_get_fd(bus);
  served_[descriptor] = {bus, EPOLLIN};
  _watch(descriptor);
  _process(bus);
}

void FloorService::_accept() {
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
  _serve(bus);
}

void FloorService::run() {
  std::array<epoll_event, 64> events{};
  while (true) {
    const int count = ::epoll_wait(epoll_, events.data(), events.size(), -1);
    for (int i = 0; i < count; ++i) {
      _handleReadiness(events[static_cast<std::size_t>(i)].data.fd);
    }
  }
}

void FloorService::_handleReadiness(int descriptor) {
  if (descriptor == listener_) return _accept();
  if (descriptor == worker_.wakeUp()) return _sendReplies();
  if (const auto found = served_.find(descriptor); found != served_.end()) {
    _process(found->second.bus);
  }
}

int FloorService::_handle(sd_bus_message* message) {
  std::uint8_t type = 0;
  sd_bus_message_get_type(message, &type);
  if (type != SD_BUS_MESSAGE_METHOD_CALL) return 0;
  worker_.give(sd_bus_message_ref(message));
  return 1;
}

void FloorService::_sendReplies() {
  for (auto* call : worker_.take()) {
    sd_bus_message* reply = nullptr;
    sd_bus_message_new_method_return(call, &reply);
    if (std::string_view(sd_bus_message_get_member(call)) == "Configure") {
      sd_bus_message_append(reply, "s", "unix:path=/nowhere");
    } else {
      _appendAnswer(reply);
    }
    auto* bus = sd_bus_message_get_bus(call);
    sd_bus_send(bus, reply, nullptr);
    sd_bus_message_unref(reply);
    _process(bus);
    sd_bus_message_unref(call);
  }
}

void FloorService::_appendAnswer(sd_bus_message* reply) const {
  if (body_.empty()) {
    sd_bus_message_append(reply, "xa{sv}a{sv}", std::int64_t{1}, 0, 0);
    return;
  }
  sd_bus_message_append(reply, "x", std::int64_t{1});
  sd_bus_message_open_container(reply, 'a', "{sv}");
  sd_bus_message_append(reply, "{sv}", "scale", "d", 1.0);
  sd_bus_message_open_container(reply, 'e', "sv");
  sd_bus_message_append(reply, "s", "data");
  sd_bus_message_open_container(reply, 'v', "ay");
  sd_bus_message_append_array(reply, 'y', body_.data(), body_.size());
  for (int i = 0; i < 3; ++i) sd_bus_message_close_container(reply);
  sd_bus_message_append(reply, "a{sv}", 0);
}

void FloorService::_process(sd_bus* bus) {
  const int descriptor = sd_bus_get_fd(bus);
  int result = 1;
  while (result > 0) result = sd_bus_process(bus, nullptr);
  if (result >= 0) return _updateMask(bus, descriptor);
  served_.erase(descriptor);
  sd_bus_close_unref(bus);
}

void FloorService::_updateMask(sd_bus* bus, int descriptor) {
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
