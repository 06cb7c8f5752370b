#pragma once

#include <poll.h>
#include <stdlib.h>
#include <sys/eventfd.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <systemd/sd-bus.h>
#include <unistd.h>

#include <algorithm>
#include <functional>
#include <future>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

namespace zelkor {

// Somebody who answers D-Bus calls on a Unix socket the way a test says, one handler a member. A
// call without a handler is never answered. Hello is answered, so that it can play a bus too.
//
// Threading: handlers run on its own thread; the rest is for the test's.
class TinyDaemon {
 public:
  using Handler = std::function<void(sd_bus_message* call)>;

  TinyDaemon() : wakeUp_(::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {
    char folder[] = "/tmp/tiny.XXXXXX";
    folder_ = ::mkdtemp(folder);
    listener_ = ::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0);
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    path().copy(address.sun_path, sizeof address.sun_path - 1);
    ::bind(listener_, reinterpret_cast<const sockaddr*>(&address), sizeof address);
    ::listen(listener_, 16);
    on("Hello", [](sd_bus_message* call) { sd_bus_reply_method_return(call, "s", ":1.1"); });
    thread_ = std::thread([this] { _run(); });
  }

  ~TinyDaemon() {
    _post([this] { stopped_ = true; });
    thread_.join();
    ::close(listener_);
    ::close(wakeUp_);
    ::unlink(path().c_str());
    ::rmdir(folder_.c_str());
  }

  std::string path() const { return folder_ + "/socket"; }
  std::string address() const { return "unix:path=" + path(); }

  void on(const std::string& member, Handler handler) {
    const std::lock_guard lock(mutex_);
    handlers_[member] = std::move(handler);
  }
  // A handler that replies with these values.
  template <typename... Values>
  void reply(const std::string& member, const char* types, Values... values) {
    on(member, [types, values...](sd_bus_message* call) {
      sd_bus_reply_method_return(call, types, values...);
    });
  }

  // Runs it with all connections; returns when it is done.
  void withConnections(const std::function<void(std::vector<sd_bus*>&)>& use) {
    std::promise<void> done;
    _post([&] {
      use(connections_);
      done.set_value();
    });
    done.get_future().get();
  }
  void closeConnections() {
    withConnections([](std::vector<sd_bus*>& connections) {
      for (auto* connection : connections) sd_bus_close_unref(connection);
      connections.clear();
    });
  }
  // Members in the order they were called, without Hello.
  std::vector<std::string> calls() {
    const std::lock_guard lock(mutex_);
    return calls_;
  }

  // Serves one end of a new socket pair; gives the other. For handlers.
  int makePrivateConnection() {
    int ends[2];
    ::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0, ends);
    _serve(ends[0]);
    return ends[1];
  }

 private:
  void _post(std::function<void()> task) {
    {
      const std::lock_guard lock(mutex_);
      tasks_.push_back(std::move(task));
    }
    ::eventfd_write(wakeUp_, 1);
  }

  void _serve(int descriptor) {
    sd_bus* bus = nullptr;
    sd_bus_new(&bus);
    sd_id128_t id{};
    sd_id128_randomize(&id);
    sd_bus_set_server(bus, 1, id);
    sd_bus_negotiate_fds(bus, 1);
    sd_bus_set_fd(bus, descriptor, descriptor);
    sd_bus_add_filter(
        bus, nullptr,
        [](sd_bus_message* message, void* self, sd_bus_error*) {
          return static_cast<TinyDaemon*>(self)->_handle(message);
        },
        this);
    sd_bus_start(bus);
    connections_.push_back(bus);
  }

  int _handle(sd_bus_message* message) {
    std::uint8_t type = 0;
    sd_bus_message_get_type(message, &type);
    if (type != SD_BUS_MESSAGE_METHOD_CALL) return 0;
    const std::string member = sd_bus_message_get_member(message);
    Handler handler;
    {
      const std::lock_guard lock(mutex_);
      if (member != "Hello") calls_.push_back(member);
      if (const auto found = handlers_.find(member); found != handlers_.end())
        handler = found->second;
    }
    if (handler) handler(message);
    return 1;
  }

  void _run() {
    while (!stopped_) {
      _runTasks();
      _processConnections();
      _wait();
    }
    for (auto* bus : connections_) sd_bus_close_unref(bus);
  }

  void _runTasks() {
    std::vector<std::function<void()>> tasks;
    {
      const std::lock_guard lock(mutex_);
      tasks.swap(tasks_);
    }
    for (const auto& task : tasks) task();
  }

  void _processConnections() {
    const auto current = connections_;  // a handler may add one
    for (auto* bus : current) {
      int result = 1;
      while (result > 0) result = sd_bus_process(bus, nullptr);
      if (result >= 0) continue;
      connections_.erase(std::find(connections_.begin(), connections_.end(), bus));
      sd_bus_close_unref(bus);
    }
  }

  void _wait() {
    std::vector<pollfd> descriptors{{wakeUp_, POLLIN, 0}, {listener_, POLLIN, 0}};
    for (auto* bus : connections_) {
      descriptors.push_back({sd_bus_get_fd(bus), static_cast<short>(sd_bus_get_events(bus)), 0});
    }
    if (stopped_) return;
    ::poll(descriptors.data(), descriptors.size(), -1);
    eventfd_t count = 0;
    ::eventfd_read(wakeUp_, &count);
    const int accepted = ::accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK);
    if (accepted >= 0) _serve(accepted);
  }

  std::string folder_;
  const int wakeUp_;
  int listener_ = -1;

  std::mutex mutex_;
  std::map<std::string, Handler> handlers_;
  std::vector<std::string> calls_;
  std::vector<std::function<void()>> tasks_;

  // Its thread's.
  std::vector<sd_bus*> connections_;
  bool stopped_ = false;

  std::thread thread_;
};

}  // namespace zelkor
