#pragma once

#include <gtest/gtest.h>
#include <poll.h>
#include <signal.h>
#include <spawn.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <systemd/sd-bus.h>

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "platform/linux/ipc/BusPointers.h"
#include "platform/linux/ipc/SdBusInterprocess.h"
#include "platform/linux/queues/LinuxClock.h"
#include "platform/linux/queues/LinuxWorkQueues.h"
#include "platform/linux/system/Descriptor.h"
#include "platform/testing/FakeCounters.h"
#include "platform/testing/RecordingLog.h"

namespace zelkord::ipc {

inline constexpr const char* kTestService = "com.quenta.zelkord";
inline constexpr const char* kTestPath = "/com/quenta/zelkord";
inline constexpr const char* kTestInterface = "com.quenta.zelkord.Daemon1";
inline constexpr const char* kTestSharedInterface = "com.quenta.zelkord.Diagnostics1";
// What only a fault exceeds, however busy the machine is.
inline constexpr std::chrono::seconds kTestPatience{20};

// Waits for a condition that other threads bring about.
inline bool eventually(const std::function<bool()>& condition) {
  const auto limit = std::chrono::steady_clock::now() + kTestPatience;
  while (!condition()) {
    if (std::chrono::steady_clock::now() > limit) return false;
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
  }
  return true;
}

// A directory for the length of a test.
class IpcTestDirectory {
 public:
  IpcTestDirectory() {
    std::string name = "/tmp/zelkord-ipc-XXXXXX";
    path_ = ::mkdtemp(name.data());
  }
  ~IpcTestDirectory() { std::filesystem::remove_all(path_); }
  const std::string& path() const { return path_; }

 private:
  std::string path_;
};

// A session bus of our own.
class IpcTestBus {
 public:
  explicit IpcTestBus(const std::string& directory)
      : socket_(directory + "/bus"), configuration_(directory + "/bus.conf") {
    std::ofstream(configuration_)
        << "<busconfig><type>session</type><listen>unix:path=" << socket_
        << "</listen><auth>EXTERNAL</auth><policy context='default'><allow send_destination='*'"
        << " eavesdrop='true'/><allow eavesdrop='true'/><allow own='*'/></policy>"
        << "<limit name='max_replies_per_connection'>50000</limit></busconfig>";
    start();
  }
  ~IpcTestBus() { stop(); }
  // Again, at the same address.
  void start() {
    const auto option = "--config-file=" + configuration_;
    const char* arguments[] = {"dbus-daemon", option.c_str(), "--nofork", "--nopidfile", nullptr};
    if (::posix_spawnp(&pid_, arguments[0], nullptr, nullptr, const_cast<char**>(arguments),
                       environ) != 0) {
      ADD_FAILURE() << "dbus-daemon does not start";
    }
    if (!eventually([&] { return _accepts(socket_); })) ADD_FAILURE() << "dbus-daemon is silent";
  }
  void signal(int number) { ::kill(pid_, number); }
  void stop() {
    if (pid_ <= 0) return;
    ::kill(pid_, SIGTERM);
    ::waitpid(std::exchange(pid_, 0), nullptr, 0);
  }
  std::string address() const { return "unix:path=" + socket_; }
  const std::string& socket() const { return socket_; }

 private:
  // The socket's file is there a moment before anybody listens.
  static bool _accepts(const std::string& path) {
    const Descriptor socket(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
    sockaddr_un address{.sun_family = AF_UNIX, .sun_path = {}};
    path.copy(address.sun_path, sizeof(address.sun_path) - 1);
    return ::connect(socket.get(), reinterpret_cast<sockaddr*>(&address), sizeof(address)) == 0;
  }

  const std::string socket_;
  const std::string configuration_;
  pid_t pid_ = 0;
};

// A handler made of functions.
class IpcTestHandler final : public CallHandler {
 public:
  explicit IpcTestHandler(
      std::function<void(Call)> function, std::function<void()> arrived = [] {})
      : function_(std::move(function)), arrived_(std::move(arrived)) {}
  void handle(Call call) override { function_(std::move(call)); }
  void messageArrived() override { arrived_(); }

 private:
  const std::function<void(Call)> function_;
  const std::function<void()> arrived_;
};

// Admits everybody unless told otherwise; keeps every connection's weak reference.
class IpcTestDelegate final : public ListenerDelegate {
 public:
  using Decide = std::function<void(std::optional<Subscription>)>;

  std::function<void(Call, const std::shared_ptr<Connection>&)> onCall;
  std::function<void(const Peer&, Decide)> onAdmit;
  std::atomic<int> admitted = 0;
  std::atomic<int> placesTaken = 0;
  std::atomic<int> begun = 0;
  std::atomic<int> invalidated = 0;
  std::atomic<int> calls = 0;
  std::atomic<int> otherMessages = 0;

  void admit(const Peer& peer, Decide decide) override {
    ++admitted;
    if (onAdmit) return onAdmit(peer, std::move(decide));
    decide(place());
  }
  void connectionBegan(const std::shared_ptr<Connection>& connection) override {
    ++begun;
    const std::weak_ptr<Connection> weak = connection;
    connection->setHandler(std::make_shared<IpcTestHandler>(
        [this, weak](Call call) {
          ++calls;
          if (const auto open = weak.lock()) onCall(std::move(call), open);
        },
        [this] { ++otherMessages; }));
    connection->setInvalidationHandler([this] { ++invalidated; });
    const std::lock_guard lock(mutex_);
    connections_.push_back(weak);
  }
  Subscription place() {
    ++placesTaken;
    return Subscription([this] { --placesTaken; });
  }
  // The newest connection; null once it has ended and been let go.
  std::shared_ptr<Connection> newest() {
    const std::lock_guard lock(mutex_);
    return connections_.empty() ? nullptr : connections_.back().lock();
  }

 private:
  std::mutex mutex_;
  std::vector<std::weak_ptr<Connection>> connections_;
};

// A blocking client, on a bus or on a private socket.
class IpcTestClient {
 public:
  // `isBusClient`: says Hello, as a bus wants it.
  IpcTestClient(const std::string& address, bool isBusClient) {
    sd_bus* bus = nullptr;
    sd_bus_new(&bus);
    bus_.reset(bus);
    sd_bus_set_address(bus, address.c_str());
    sd_bus_set_bus_client(bus, isBusClient);
    sd_bus_set_method_call_timeout(bus, 20'000'000);
    started_ = sd_bus_start(bus);
  }
  explicit IpcTestClient(Descriptor socket) {
    sd_bus* bus = nullptr;
    sd_bus_new(&bus);
    bus_.reset(bus);
    sd_bus_set_fd(bus, socket.get(), socket.get());
    socket.release();
    sd_bus_set_method_call_timeout(bus, 20'000'000);
    started_ = sd_bus_start(bus);
  }

  sd_bus* bus() { return bus_.get(); }
  int started() const { return started_; }
  // What the call ended with: "" for a reply, the error's name, or "errno N" when the connection is
  // gone.
  template <typename... A>
  std::string call(const char* interface, const char* member, const char* types, A... arguments) {
    sd_bus_error error{};
    sd_bus_message* answer = nullptr;
    const int r = sd_bus_call_method(bus_.get(), kTestService, kTestPath, interface, member, &error,
                                     &answer, types, arguments...);
    reply_.reset(answer);
    std::string name;
    if (r < 0) {
      const bool isRemote = error.name && !std::string_view(error.name).starts_with("System.Error");
      name = isRemote ? error.name : "errno " + std::to_string(-r);
    }
    sd_bus_error_free(&error);
    return name;
  }
  sd_bus_message* reply() { return reply_.get(); }
  std::string replyText() {
    const char* text = "";
    if (sd_bus_message_read(reply_.get(), "s", &text) < 0) return "(no text)";
    return text;
  }
  MessagePtr newCall(const char* member) {
    sd_bus_message* message = nullptr;
    sd_bus_message_new_method_call(bus_.get(), &message, kTestService, kTestPath, kTestInterface,
                                   member);
    return MessagePtr(message);
  }
  MessagePtr newSignal() {
    sd_bus_message* message = nullptr;
    sd_bus_message_new_signal(bus_.get(), &message, kTestPath, "com.quenta.zelkord.Client1", "Any");
    sd_bus_message_set_destination(message, kTestService);
    return MessagePtr(message);
  }
  // Sends without waiting; the answer is dropped.
  void send(MessagePtr message) {
    std::uint64_t cookie = 0;
    sd_bus_send(bus_.get(), message.get(), &cookie);
  }
  // Handles what comes until the condition holds.
  bool processUntil(const std::function<bool()>& condition) {
    const auto limit = std::chrono::steady_clock::now() + kTestPatience;
    while (std::chrono::steady_clock::now() < limit) {
      while (sd_bus_process(bus_.get(), nullptr) > 0) {
      }
      if (condition()) return true;
      sd_bus_wait(bus_.get(), 10'000);
    }
    return condition();
  }
  // Whether the other side has closed.
  bool isClosed() {
    return processUntil([this] { return sd_bus_is_open(bus_.get()) <= 0; });
  }

 private:
  BusPtr bus_;
  MessagePtr reply_;
  int started_ = 0;
};

// A socket that speaks bytes.
class IpcRawClient {
 public:
  explicit IpcRawClient(const std::string& path)
      : socket_(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
    sockaddr_un address{.sun_family = AF_UNIX, .sun_path = {}};
    path.copy(address.sun_path, sizeof(address.sun_path) - 1);
    connected_ =
        ::connect(socket_.get(), reinterpret_cast<sockaddr*>(&address), sizeof(address)) == 0;
  }
  bool connected() const { return connected_; }
  int descriptor() const { return socket_.get(); }
  Descriptor take() { return std::move(socket_); }
  bool send(std::string_view bytes) {
    while (!bytes.empty()) {
      const auto sent = ::send(socket_.get(), bytes.data(), bytes.size(), MSG_NOSIGNAL);
      if (sent <= 0) return false;
      bytes.remove_prefix(static_cast<std::size_t>(sent));
    }
    return true;
  }
  // Everything until the other side closes; none when it does not.
  std::optional<std::string> readToEnd() {
    const int milliseconds = std::chrono::milliseconds(kTestPatience).count();
    std::string all;
    char bytes[4096];
    for (;;) {
      pollfd waiting{.fd = socket_.get(), .events = POLLIN, .revents = 0};
      if (::poll(&waiting, 1, milliseconds) <= 0) return std::nullopt;
      const auto count = ::recv(socket_.get(), bytes, sizeof(bytes), 0);
      if (count <= 0) return all;
      all.append(bytes, static_cast<std::size_t>(count));
    }
  }

 private:
  Descriptor socket_;
  bool connected_ = false;
};

// The interfaces that tests serve.
inline ListenerConfiguration ipcTestConfiguration(std::shared_ptr<CallHandler> shared = nullptr) {
  ListenerConfiguration configuration;
  configuration.interfaces = {{kTestInterface,
                               {{"Echo", "s", "s"},
                                {"Bytes", "ay", "ay"},
                                {"Dictionary", "a{sv}", "s"},
                                {"Refuse", "", ""},
                                {"Never", "", ""},
                                {"Silent", "", "", true},
                                {"Handle", "", "ah"},
                                {"Many", "u", "ay"},
                                {"Leave", "", ""},
                                {"CallBack", "s", ""}},
                               {{"Invalidated", ""}}},
                              {kTestSharedInterface, {{"Status", "", "s"}}, {}}};
  configuration.connectionInterface = kTestInterface;
  configuration.sharedHandler = std::move(shared);
  return configuration;
}

// Answers the methods above.
inline void answerIpcTestCall(const Call& call, const std::shared_ptr<Connection>& connection) {
  const auto& arguments = call.arguments;
  if (call.member == "Echo" || call.member == "Bytes") call.reply->send(arguments);
  if (call.member == "Status") call.reply->send({"connected"});
  if (call.member == "Refuse") call.reply->fail("com.quenta.zelkord.Error.Refused", "no");
  if (call.member == "Leave") connection->invalidate();
  if (call.member == "Handle") call.reply->send({FileHandles{FileHandle(::dup(0))}});
  if (call.member == "Many") {
    call.reply->send({Data(std::string(*arguments.at(0).get<std::uint32_t>(), 'm'))});
  }
  if (call.member == "CallBack") {
    connection->callClient("/com/quenta/zelkord/client", "com.quenta.zelkord.Client1", "BagDidLoad",
                           "s", {arguments.at(0)}, nullptr);
    call.reply->send({});
  }
  if (call.member == "Dictionary") {
    std::string seen;
    for (const auto& [key, value] : *arguments.at(0).get<Dictionary>()) {
      seen += key + ":" + signatureOf(value) + " ";
    }
    call.reply->send({seen});
  }
}

// A transport on real queues, with its runtime directory, and a bus when wanted.
class IpcTestServer {
 public:
  explicit IpcTestServer(bool withBus, const std::function<void(SdBusOptions&)>& change = {}) {
    SdBusOptions options;
    options.runtimeDirectory = directory.path() + "/run";
    options.usesHandedOverSocket = false;
    options.usesSessionBus = withBus;
    options.crew = &queues.crew();
    if (withBus) {
      bus.emplace(directory.path());
      options.sessionBusAddress = bus->address();
    }
    if (change) change(options);
    delegate->onCall = answerIpcTestCall;
    interprocess.emplace(queues, log, limits, options);
    socketPath = options.runtimeDirectory + "/" + options.socketName;
  }
  ~IpcTestServer() { interprocess.reset(); }

  std::optional<Error> listen() {
    const auto shared =
        std::make_shared<IpcTestHandler>([](const Call& call) { call.reply->send({"shared"}); });
    return interprocess->listen(kTestService, ipcTestConfiguration(shared), delegate);
  }
  IpcTestClient socketClient() { return {"unix:path=" + socketPath, false}; }
  IpcTestClient busClient() { return {bus->address(), true}; }

  IpcTestDirectory directory;
  std::optional<IpcTestBus> bus;
  LinuxClock clock;
  RecordingLog log;
  std::shared_ptr<IpcTestDelegate> delegate = std::make_shared<IpcTestDelegate>();
  FakeCounters counters;
  LimitReports limits{clock, counters, Logger(log, "limits")};
  LinuxWorkQueues queues{clock};
  std::optional<SdBusInterprocess> interprocess;
  std::string socketPath;
};

}  // namespace zelkord::ipc
