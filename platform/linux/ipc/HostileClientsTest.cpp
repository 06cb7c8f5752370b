#include <fcntl.h>
#include <gtest/gtest.h>
#include <malloc.h>
#include <sys/resource.h>

#include <array>

#include "platform/linux/ipc/IpcTestSupport.h"
#include "platform/linux/process/StartMemory.h"

namespace zelkord::ipc {
namespace {

using namespace std::string_literals;

// Sanitizers keep what was freed, and take their time to move much.
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr bool kMeasuresMemory = false;
#elif defined(__has_feature)
#if __has_feature(address_sanitizer) || __has_feature(thread_sanitizer)
constexpr bool kMeasuresMemory = false;
#else
constexpr bool kMeasuresMemory = true;
#endif
#else
constexpr bool kMeasuresMemory = true;
#endif

constexpr rlim_t kFewDescriptors = 1024;
constexpr std::chrono::seconds kServedWithin{1};
constexpr std::size_t kProcessMemory = 64u << 20;
constexpr std::size_t kLargestMessage = 4u << 20;
constexpr std::size_t kSlack = 1u << 20;  // of the client that is served
constexpr std::size_t kMemoryOverTheAccounted = 64u << 20;

void limitDescriptors(rlim_t count) {
  rlimit limit{};
  ::getrlimit(RLIMIT_NOFILE, &limit);
  limit.rlim_cur = std::min(count, limit.rlim_max);
  ::setrlimit(RLIMIT_NOFILE, &limit);
}

// What an attacker does in a process of its own, and what it then keeps.
struct Attack {
  const char* name;
  void (*run)(const std::string& socket);
};

int connectTo(const std::string& path) {
  sockaddr_un address{.sun_family = AF_UNIX, .sun_path = {}};
  path.copy(address.sun_path, sizeof(address.sun_path) - 1);
  for (;;) {
    const int fd = ::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
    if (::connect(fd, reinterpret_cast<sockaddr*>(&address), sizeof(address)) == 0) return fd;
    ::close(fd);
    ::usleep(1000);  // the daemon does not listen yet
  }
}

void sendAll(int fd, std::string_view bytes) {
  while (!bytes.empty()) {
    const auto sent = ::send(fd, bytes.data(), bytes.size(), MSG_NOSIGNAL);
    if (sent <= 0) return;
    bytes.remove_prefix(static_cast<std::size_t>(sent));
  }
}

const std::string kBegin = "\0AUTH EXTERNAL\r\nDATA\r\nNEGOTIATE_UNIX_FD\r\nBEGIN\r\n"s;

// The header of a message of that size.
std::string headerOf(std::uint32_t size) {
  const std::uint32_t numbers[] = {size - 16, 1, 0};
  return "l\1\0\1"s + std::string(reinterpret_cast<const char*>(numbers), sizeof(numbers));
}

void connectAndSayNothing(const std::string& socket) {
  for (int i = 0; i < 3000; ++i) connectTo(socket);
}

void connectAndAuthenticate(const std::string& socket) {
  for (int i = 0; i < 1000; ++i) sendAll(connectTo(socket), kBegin);
}

void sendDescriptors(const std::string& socket) {
  constexpr int kAtOnce = 100;
  for (int i = 0; i < 40; ++i) {
    const int fd = connectTo(socket);
    sendAll(fd, kBegin + headerOf(1u << 20));
    for (int piece = 0; piece < 20; ++piece) {
      char byte = 0;
      iovec part{&byte, 1};
      alignas(cmsghdr) std::array<char, CMSG_SPACE(kAtOnce * sizeof(int))> control{};
      msghdr message{};
      message.msg_iov = &part;
      message.msg_iovlen = 1;
      message.msg_control = control.data();
      message.msg_controllen = control.size();
      auto* const attached = CMSG_FIRSTHDR(&message);
      attached->cmsg_level = SOL_SOCKET;
      attached->cmsg_type = SCM_RIGHTS;
      attached->cmsg_len = CMSG_LEN(kAtOnce * sizeof(int));
      auto* const numbers = reinterpret_cast<int*>(CMSG_DATA(attached));
      std::fill(numbers, numbers + kAtOnce, fd);
      ::sendmsg(fd, &message, MSG_NOSIGNAL);
    }
  }
}

template <int kCount>
void sendUnfinishedMessages(const std::string& socket) {
  const auto bytes = kBegin + headerOf(4u << 20) + std::string((4u << 20) - 17, 'x');
  for (int i = 0; i < kCount; ++i) sendAll(connectTo(socket), bytes);
}

void leaveRepliesUnread(const std::string& socket) {
  static std::vector<IpcTestClient> clients;
  for (int i = 0; i < 40; ++i) {
    auto& client = clients.emplace_back(Descriptor(connectTo(socket)));
    for (int call = 0; call < 30; ++call) {
      auto message = client.newCall("Many");
      sd_bus_message_append(message.get(), "u", 500'000u);
      client.send(std::move(message));
    }
    sd_bus_flush(client.bus());
  }
}

// A process that attacks as soon as somebody listens, until it is destroyed. Made before any
// thread.
class Attacker {
 public:
  Attacker(const std::string& socket, const Attack& attack) {
    EXPECT_EQ(::pipe2(pipe_, O_CLOEXEC), 0);
    pid_ = ::fork();
    if (pid_ != 0) {
      ::close(pipe_[1]);
      return;
    }
    limitDescriptors(RLIM_INFINITY);
    attack.run(socket);
    ::close(pipe_[1]);
    for (;;) ::pause();
  }
  ~Attacker() {
    ::kill(pid_, SIGKILL);
    ::waitpid(pid_, nullptr, 0);
    ::close(pipe_[0]);
  }
  // When all is sent.
  bool waitUntilDone() {
    pollfd waiting{.fd = pipe_[0], .events = POLLIN, .revents = 0};
    return ::poll(&waiting, 1, std::chrono::milliseconds(3 * kTestPatience).count()) == 1;
  }

 private:
  int pipe_[2] = {-1, -1};
  pid_t pid_ = 0;
};

std::size_t residentBytes() {
  std::size_t total = 0;
  std::size_t resident = 0;
  std::ifstream("/proc/self/statm") >> total >> resident;
  return resident * static_cast<std::size_t>(::sysconf(_SC_PAGESIZE));
}

// Without what earlier tests have left behind, and with the heap as the daemon has it.
std::size_t residentBytesOnly() {
  keepHeapSmall();
  ::malloc_trim(0);
  return residentBytes();
}

std::size_t openDescriptors() {
  return static_cast<std::size_t>(
      std::distance(std::filesystem::directory_iterator("/proc/self/fd"), {}));
}

class HostileClientsTest : public testing::TestWithParam<Attack> {
 public:
  HostileClientsTest() { limitDescriptors(kFewDescriptors); }
  ~HostileClientsTest() override { ::setrlimit(RLIMIT_NOFILE, &before_); }

 protected:
  const rlimit before_ = [] {
    rlimit limit{};
    ::getrlimit(RLIMIT_NOFILE, &limit);
    return limit;
  }();
  IpcTestDirectory directory_;
};

TEST_P(HostileClientsTest, OneProcessKeepsNobodyElseOutAndHoldsItsShareOnly) {
  Attacker attacker(directory_.path() + "/socket", GetParam());
  IpcTestServer server(
      false, [this](SdBusOptions& options) { options.runtimeDirectory = directory_.path(); });
  const auto residentBefore = residentBytesOnly();
  ASSERT_FALSE(server.listen());
  const auto isServed = [&] {
    const auto begun = std::chrono::steady_clock::now();
    auto client = server.socketClient();
    EXPECT_EQ(client.call(kTestInterface, "Echo", "s", "served"), "");
    return std::chrono::steady_clock::now() - begun;
  };
  auto fastest = isServed();  // at its height
  EXPECT_TRUE(attacker.waitUntilDone());
  for (int i = 0; i < 3; ++i) fastest = std::min(fastest, isServed());
  EXPECT_LT(fastest, kServedWithin);
  EXPECT_LT(server.interprocess->statistics().heldBytes, kProcessMemory + kLargestMessage + kSlack);
  const auto residentLimit = residentBefore + kProcessMemory + kMemoryOverTheAccounted;
  EXPECT_TRUE(eventually([&] { return residentBytes() < residentLimit || !kMeasuresMemory; }))
      << residentBytes() - residentBefore;
  EXPECT_LT(openDescriptors(), kFewDescriptors / 2);
}

INSTANTIATE_TEST_SUITE_P(Attacks, HostileClientsTest,
                         testing::Values(Attack{"Unauthenticated", connectAndSayNothing},
                                         Attack{"Connections", connectAndAuthenticate},
                                         Attack{"Descriptors", sendDescriptors},
                                         Attack{"UnfinishedMessages",
                                                sendUnfinishedMessages<kMeasuresMemory ? 150 : 40>},
                                         Attack{"UnreadReplies", leaveRepliesUnread}),
                         [](const auto& attack) { return std::string(attack.param.name); });

TEST(ClientMemoryLimitTest, ManyProcessesTogetherHoldNoMoreThanThereIs) {
  constexpr std::size_t kAllMemory = 4 * kProcessMemory;
  IpcTestDirectory directory;
  std::vector<std::unique_ptr<Attacker>> attackers;
  for (int i = 0; i < 6; ++i) {
    attackers.push_back(std::make_unique<Attacker>(
        directory.path() + "/socket",
        Attack{"UnfinishedMessages", sendUnfinishedMessages < kMeasuresMemory ? 20 : 12 > }));
  }
  IpcTestServer server(false,
                       [&](SdBusOptions& options) { options.runtimeDirectory = directory.path(); });
  const auto residentBefore = residentBytesOnly();
  ASSERT_FALSE(server.listen());
  for (const auto& attacker : attackers) EXPECT_TRUE(attacker->waitUntilDone());
  auto client = server.socketClient();
  EXPECT_EQ(client.call(kTestInterface, "Echo", "s", "served"), "");
  const auto held = server.interprocess->statistics().heldBytes;
  EXPECT_GT(held, kAllMemory / 2);
  EXPECT_LE(held, kAllMemory);
  const auto residentLimit = residentBefore + kAllMemory + kMemoryOverTheAccounted;
  EXPECT_TRUE(eventually([&] { return residentBytes() < residentLimit || !kMeasuresMemory; }))
      << residentBytes() - residentBefore;
}

TEST(ConnectionLimitTest, TwoHundredOfOneProcessFitAndTheNextButFewAreRefusedOnEveryDoor) {
  IpcTestServer server(true, [](SdBusOptions& options) { options.descriptors = kFewDescriptors; });
  ASSERT_FALSE(server.listen());
  auto onBus = server.busClient();
  std::vector<IpcTestClient> clients;
  for (int i = 0; i < 256; ++i) {
    EXPECT_EQ(clients.emplace_back(server.socketClient()).call(kTestInterface, "Echo", "s", ""),
              "");
  }
  const std::string refused = "org.freedesktop.DBus.Error.LimitsExceeded";
  EXPECT_TRUE(server.socketClient().isClosed());
  EXPECT_EQ(onBus.call("com.quenta.zelkord.Service1", "Open", ""), refused);
  EXPECT_EQ(onBus.call(kTestInterface, "Echo", "s", ""), refused);
  EXPECT_EQ(onBus.call(kTestSharedInterface, "Status", ""), "");
  auto configuration = ipcTestConfiguration();
  configuration.delegateBoundsConnections = true;
  const auto endpoint = server.interprocess->makeAnonymousListener(configuration, server.delegate);
  IpcTestClient bounded(endpoint->address(), false);
  EXPECT_EQ(bounded.call(kTestInterface, "Echo", "s", ""), "");
  server.delegate->onAdmit = [](const Peer&, const IpcTestDelegate::Decide&) {};
  const auto path = endpoint->address().substr(endpoint->address().find('/'));
  std::vector<std::unique_ptr<IpcRawClient>> waiting;
  for (int i = 0; i < 32; ++i) waiting.push_back(std::make_unique<IpcRawClient>(path));
  EXPECT_EQ(IpcRawClient(path).readToEnd(), "") << "too many wait for their admission";
  EXPECT_EQ(server.counters.value("com.quenta.zelkord.limit.unadmitted_connections"), 1);
  EXPECT_GE(server.counters.value("com.quenta.zelkord.limit.connections"), 3);
  for (int i = 0; i < 6; ++i) clients.pop_back();
  EXPECT_TRUE(eventually([&] { return onBus.call(kTestInterface, "Echo", "s", "").empty(); }));
}

TEST(ConnectionLimitTest, CallersOnTheBusAreBoundedWithoutConnectionsToo) {
  // 16 callers; half of them for a process that is alone.
  IpcTestServer server(true, [](SdBusOptions& options) { options.descriptors = 16; });
  ASSERT_FALSE(server.listen());
  std::vector<IpcTestClient> callers;
  for (int i = 0; i < 8; ++i) {
    EXPECT_EQ(callers.emplace_back(server.busClient()).call(kTestSharedInterface, "Status", ""),
              "");
  }
  auto next = server.busClient();
  for (int i = 0; i < 2; ++i) {
    EXPECT_EQ(next.call(kTestSharedInterface, "Status", ""),
              "org.freedesktop.DBus.Error.LimitsExceeded");
  }
  callers.pop_back();
  std::string last;
  EXPECT_TRUE(eventually([&] {
    last = next.call(kTestSharedInterface, "Status", "");
    return last.empty();
  })) << last;
}

TEST(ConnectionLimitTest, AMessageWithDescriptorsEndsItsConnectionAndNoneStaysOpen) {
  IpcTestServer server(false);
  ASSERT_FALSE(server.listen());
  auto client = server.socketClient();
  ASSERT_EQ(client.call(kTestInterface, "Handle", ""), "");
  const auto before = openDescriptors();
  auto call = client.newCall("Dictionary");
  for (int i = 0; i < 100; ++i) sd_bus_message_append(call.get(), "h", 0);
  client.send(std::move(call));
  EXPECT_TRUE(client.isClosed());
  EXPECT_TRUE(eventually([&] { return openDescriptors() <= before; }));
}

TEST(ConnectionLimitTest, DescriptorsInUnreadRepliesAreFew) {
  IpcTestServer server(false);
  ASSERT_FALSE(server.listen());
  auto client = server.socketClient();
  ASSERT_EQ(client.call(kTestInterface, "Handle", ""), "");
  const auto before = openDescriptors();
  for (int i = 0; i < 3000; ++i) client.send(client.newCall("Handle"));
  EXPECT_TRUE(eventually([&] { return server.log.contains("does not read"); }));
  EXPECT_TRUE(eventually([&] { return openDescriptors() < before + 16; }));
}

TEST(CallLimitTest, TheCallsOfAProcessAreBoundedOverItsConnections) {
  std::mutex mutex;
  std::vector<Call> kept;
  IpcTestServer server(false, [](SdBusOptions& options) { options.processCallsUnderWay = 8; });
  ASSERT_FALSE(server.listen());
  server.delegate->onCall = [&](const Call& call, const auto&) {
    const std::lock_guard lock(mutex);
    kept.push_back(call);
  };
  int refused = 0;
  const auto count = [](sd_bus_message* m, void* to, sd_bus_error*) {
    *static_cast<int*>(to) +=
        sd_bus_message_is_method_error(m, "org.freedesktop.DBus.Error.LimitsExceeded");
    return 1;
  };
  auto one = server.socketClient();
  auto two = server.socketClient();
  for (auto* client : {&one, &two}) {
    for (int i = 0; i < 5; ++i) {
      const auto call = client->newCall("Never");
      sd_bus_call_async(client->bus(), nullptr, call.get(), count, &refused, 0);
    }
    const int wanted = client == &one ? 0 : 2;
    client->processUntil([&] { return server.delegate->calls >= 5 && refused == wanted; });
  }
  EXPECT_EQ(refused, 2);
  EXPECT_EQ(server.counters.value("com.quenta.zelkord.limit.calls"), 2);
}

}  // namespace
}  // namespace zelkord::ipc
