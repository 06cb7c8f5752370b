#include <gtest/gtest.h>
#include <linux/sockios.h>
#include <sys/ioctl.h>
#include <sys/resource.h>
#include <sys/stat.h>

#include <set>

#include "platform/linux/ipc/IpcTestSupport.h"
#include "platform/linux/ipc/ListeningSocket.h"

namespace zelkord::ipc {
namespace {

using namespace std::string_literals;

const std::string kAuthentication = "\0AUTH EXTERNAL\r\nDATA\r\nBEGIN\r\n"s;
constexpr std::size_t kMessageLimit = 4u << 20;
constexpr const char* kDescriptorLimit = "com.quenta.zelkord.limit.descriptors";

// The header of a method call whose whole size is that.
std::string messageHeader(std::uint32_t size) {
  std::string bytes("l\1\0\1", 4);
  const std::uint32_t body = size - 16;
  const std::uint32_t numbers[] = {body, 1, 0};
  return bytes + std::string(reinterpret_cast<const char*>(numbers), sizeof(numbers));
}

// A call of Echo as a client sends it.
std::string echoMessage(const std::string& text) {
  const auto aligned = [](std::string part, std::size_t unit) {
    part.resize((part.size() + unit - 1) / unit * unit);
    return part;
  };
  const auto number = [](std::size_t value) {
    const auto wire = static_cast<std::uint32_t>(value);
    return std::string(reinterpret_cast<const char*>(&wire), 4);
  };
  const auto field = [&](char code, char type, const std::string& value) {
    return aligned(std::string{code, 1, type, 0} + number(value.size()) + value + '\0', 8);
  };
  std::string fields = field(1, 'o', kTestPath) + field(2, 's', kTestInterface) +
                       field(3, 's', "Echo") + std::string("\x08\x01g\x00\x01s\x00", 7);
  const auto body = number(text.size()) + text + '\0';
  return aligned("l\1\0\1"s + number(body.size()) + number(7) + number(fields.size()) + fields, 8) +
         body;
}

class PrivateSocketTest : public testing::Test {
 protected:
  PrivateSocketTest() { EXPECT_FALSE(server_.listen()); }

  // Others are served whatever happened.
  void expectServed() {
    auto client = server_.socketClient();
    EXPECT_EQ(client.call(kTestInterface, "Echo", "s", "served"), "");
  }
  // Everything that was taken has been given back.
  void expectNothingLeft() {
    EXPECT_TRUE(eventually([&] { return server_.interprocess->statistics().connections == 0; }));
    EXPECT_TRUE(eventually([&] { return server_.delegate->placesTaken == 0; }));
    EXPECT_TRUE(
        eventually([&] { return server_.delegate->begun == server_.delegate->invalidated; }));
    EXPECT_EQ(server_.interprocess->statistics().queuedBytes, 0u);
  }

  IpcTestServer server_{false, [](SdBusOptions& options) { options.queuedBytes = 1u << 20; }};
};

TEST_F(PrivateSocketTest, GarbageEndsItsConnectionOnly) {
  const std::string badUtf8 = "\xC3("s;
  const std::pair<const char*, std::string> cases[] = {
      {"no nul byte", "GET / HTTP/1.0\r\n\r\n"},
      {"a line without end", "\0"s + std::string(2000, 'x')},
      {"begin too early", "\0BEGIN\r\n"s},
      {"not a message", kAuthentication + "GET / HTTP/1.0\r\n\r\n"},
      {"an old protocol", kAuthentication + "l\1\0\0"s + std::string(12, '\0')},
      {"broken header fields",
       kAuthentication + messageHeader(16 + 8).replace(12, 1, "\x08") + std::string(16, '\xFF')},
      {"text that is not UTF-8", kAuthentication + echoMessage(badUtf8)},
      {"a message over the limit", kAuthentication + messageHeader(kMessageLimit + 8)},
      {"a good message, then one over the limit",
       kAuthentication + echoMessage("a") + messageHeader(64u << 20)},
  };
  for (const auto& [name, bytes] : cases) {
    SCOPED_TRACE(name);
    IpcRawClient client(server_.socketPath);
    EXPECT_TRUE(client.send(bytes));
    EXPECT_TRUE(client.readToEnd());
    expectServed();
  }
  expectNothingLeft();
}

TEST_F(PrivateSocketTest, BytesMayArriveInPieces) {
  const auto text = "pieces"s;
  const auto bytes = kAuthentication + echoMessage(text) + echoMessage(text);
  for (const std::size_t piece : {1u, 5u, 100u, 4096u}) {
    SCOPED_TRACE(piece);
    IpcRawClient client(server_.socketPath);
    for (std::size_t at = 0; at < bytes.size(); at += piece) {
      ASSERT_TRUE(client.send(bytes.substr(at, piece)));
      if (piece < 100 && at % 16 == 0) std::this_thread::yield();
    }
    // Both are answered; closing our half ends the connection.
    std::string answer;
    char buffer[4096];
    while (answer.find(text) == answer.rfind(text)) {
      const auto count = ::recv(client.descriptor(), buffer, sizeof(buffer), 0);
      ASSERT_GT(count, 0);
      answer.append(buffer, static_cast<std::size_t>(count));
    }
  }
  expectNothingLeft();
}

// As many bytes are then in the socket as the first message has, though two end in them.
TEST_F(PrivateSocketTest, AMessageBehindTheRestOfAnotherIsReadToo) {
  const auto longer = echoMessage("a longer text");
  const auto shorter = echoMessage("x");
  ASSERT_LT(shorter.size(), longer.size());
  IpcRawClient client(server_.socketPath);
  ASSERT_TRUE(client.send(kAuthentication + longer.substr(0, shorter.size())));
  ASSERT_TRUE(eventually([&] {
    int unread = 0;
    return ::ioctl(client.descriptor(), SIOCOUTQ, &unread) == 0 && unread == 0;
  }));
  ASSERT_TRUE(client.send(longer.substr(shorter.size()) + shorter));
  const timeval limit{20, 0};
  ::setsockopt(client.descriptor(), SOL_SOCKET, SO_RCVTIMEO, &limit, sizeof limit);
  std::string answer;
  char buffer[4096];
  while (answer.find("x\0"s) == std::string::npos) {
    const auto count = ::recv(client.descriptor(), buffer, sizeof(buffer), 0);
    ASSERT_GT(count, 0);
    answer.append(buffer, static_cast<std::size_t>(count));
  }
}

TEST_F(PrivateSocketTest, PeersThatLeaveHalfWayAreForgotten) {
  const auto whole = kAuthentication + echoMessage("x");
  for (const std::size_t count : {0u, 1u, 5u, 30u, 36u, 40u, 60u}) {
    IpcRawClient client(server_.socketPath);
    client.send(whole.substr(0, count));
  }
  EXPECT_TRUE(eventually([&] { return server_.delegate->admitted == 7; }));
  expectNothingLeft();
}

TEST(PrivateSocketLimitTest, AuthenticationHasATimeLimit) {
  IpcTestServer server(false, [](SdBusOptions& o) { o.authenticationTimeout = 100ms; });
  ASSERT_FALSE(server.listen());
  for (const auto& bytes : {""s, "\0AUTH EXTERNAL\r\n"s}) {
    IpcRawClient client(server.socketPath);
    client.send(bytes);
    EXPECT_TRUE(client.readToEnd());
  }
  EXPECT_EQ(server.delegate->begun, 0);
  EXPECT_TRUE(eventually([&] { return server.delegate->placesTaken == 0; }));
}

TEST_F(PrivateSocketTest, ARefusedConnectionIsClosedWithoutAByte) {
  server_.delegate->onAdmit = [this](const Peer& peer, IpcTestDelegate::Decide decide) {
    EXPECT_EQ(peer.pid, ::getpid());
    server_.queues.global(QualityOfService::Default).async([decide] { decide(std::nullopt); });
  };
  IpcRawClient client(server_.socketPath);
  client.send(kAuthentication);
  EXPECT_EQ(client.readToEnd(), "");
  expectNothingLeft();
}

TEST_F(PrivateSocketTest, AClientThatDoesNotReadIsCutOff) {
  auto client = server_.socketClient();
  ASSERT_EQ(client.call(kTestInterface, "Echo", "s", ""), "");
  for (int i = 0; i < 40; ++i) {
    auto call = client.newCall("Many");
    sd_bus_message_append(call.get(), "u", 500'000u);
    client.send(std::move(call));
  }
  EXPECT_TRUE(eventually([&] { return server_.log.contains("does not read"); }));
  expectServed();
  EXPECT_TRUE(client.isClosed());
  expectNothingLeft();
}

TEST_F(PrivateSocketTest, AnAnswerMayBeLargerThanWhatMayWait) {
  auto client = server_.socketClient();
  EXPECT_EQ(client.call(kTestInterface, "Many", "u", 20'000'000u), "");
  const void* bytes = nullptr;
  std::size_t size = 0;
  EXPECT_GT(sd_bus_message_read_array(client.reply(), 'y', &bytes, &size), 0);
  EXPECT_EQ(size, 20'000'000u);
}

TEST_F(PrivateSocketTest, ALargeAnswerMayFollowAnother) {
  auto client = server_.socketClient();
  ASSERT_EQ(client.call(kTestInterface, "Echo", "s", ""), "");
  for (int i = 0; i < 2; ++i) {
    auto call = client.newCall("Many");
    sd_bus_message_append(call.get(), "u", 20'000'000u);
    client.send(std::move(call));
  }
  EXPECT_TRUE(
      eventually([&] { return server_.interprocess->statistics().queuedBytes > 39'000'000u; }));
  EXPECT_EQ(client.call(kTestInterface, "Echo", "s", "after"), "");
}

TEST_F(PrivateSocketTest, ASlowConnectionDelaysNobody) {
  auto slow = server_.socketClient();
  ASSERT_EQ(slow.call(kTestInterface, "Echo", "s", ""), "");
  const auto blocked = std::shared_ptr(server_.queues.makeSemaphore(0));
  server_.delegate->newest()->setHandler(
      std::make_shared<IpcTestHandler>([blocked](const Call&) { blocked->wait(10s); }));
  slow.send(slow.newCall("Never"));
  expectServed();
  blocked->signal();
}

TEST_F(PrivateSocketTest, ToolsThatInsistOnABusAreAnswered) {
  IpcTestClient tool("unix:path=" + server_.socketPath, true);
  EXPECT_EQ(tool.call(kTestInterface, "Echo", "s", "hello"), "");
  sd_bus_error error{};
  EXPECT_GE(
      sd_bus_call_method(tool.bus(), "org.freedesktop.DBus", "/org/freedesktop/DBus",
                         "org.freedesktop.DBus", "AddMatch", &error, nullptr, "s", "type='signal'"),
      0);
  sd_bus_error_free(&error);
  const auto command = "busctl --address=unix:path=" + server_.socketPath + " call " +
                       kTestService + " " + kTestPath + " " + kTestInterface +
                       " Echo s hi >/dev/null";
  EXPECT_EQ(std::system(command.c_str()), 0);
  const auto gdbus = "gdbus call --address unix:path=" + server_.socketPath + " -d " +
                     kTestService + " -o " + kTestPath + " -m " + kTestInterface +
                     ".Echo hi >/dev/null";
  EXPECT_EQ(std::system(gdbus.c_str()), 0);
}

TEST_F(PrivateSocketTest, ServesTwoHundredConnections) {
  std::vector<IpcTestClient> clients;
  for (int i = 0; i < 200; ++i) clients.push_back(server_.socketClient());
  for (auto& client : clients) EXPECT_EQ(client.call(kTestInterface, "Echo", "s", "x"), "");
  EXPECT_EQ(server_.interprocess->statistics().connections, 200u);
  clients.clear();
  expectNothingLeft();
}

TEST_F(PrivateSocketTest, WithoutDescriptorsAFewStillGetInAndTheRestLater) {
  constexpr int kClients = 24;
  std::vector<IpcRawClient> clients;  // their descriptors exist before the limit falls
  for (int i = 0; i < kClients; ++i) clients.emplace_back(server_.socketPath + "-none");
  rlimit before{};
  ::getrlimit(RLIMIT_NOFILE, &before);
  const rlimit none{static_cast<rlim_t>(clients.back().descriptor() + 1), before.rlim_max};
  ::setrlimit(RLIMIT_NOFILE, &none);
  sockaddr_un address{.sun_family = AF_UNIX, .sun_path = {}};
  server_.socketPath.copy(address.sun_path, sizeof(address.sun_path) - 1);
  for (auto& client : clients) {
    ASSERT_EQ(
        ::connect(client.descriptor(), reinterpret_cast<sockaddr*>(&address), sizeof(address)), 0);
    client.send(kAuthentication);
  }
  EXPECT_TRUE(eventually([&] { return server_.counters.value(kDescriptorLimit) > 0; }));
  EXPECT_TRUE(eventually([&] { return server_.delegate->begun > 0; }));
  ::setrlimit(RLIMIT_NOFILE, &before);
  EXPECT_TRUE(eventually([&] { return server_.delegate->begun == kClients; }));
}

TEST_F(PrivateSocketTest, DeadSocketsOfEarlierRunsAreRemoved) {
  const auto directory = server_.directory.path() + "/left/";
  std::filesystem::create_directory(directory);
  const auto bound = [&](const std::string& name) {
    Descriptor socket(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
    sockaddr_un address{.sun_family = AF_UNIX, .sun_path = {}};
    (directory + name).copy(address.sun_path, sizeof(address.sun_path) - 1);
    EXPECT_EQ(::bind(socket.get(), reinterpret_cast<sockaddr*>(&address), sizeof(address)), 0);
    return socket;
  };
  const std::string dead(32, 'd'), alive(32, 'a'), file(32, 'f');
  bound(dead);
  bound("socket");
  bound("somebody-elses");
  const auto listening = bound(alive);
  ASSERT_EQ(::listen(listening.get(), 1), 0);
  std::ofstream(directory + file) << "no socket";
  ListeningSocket::removeDead(directory, "socket");
  std::set<std::string> left;
  for (const auto& entry : std::filesystem::directory_iterator(directory)) {
    left.insert(entry.path().filename());
  }
  EXPECT_EQ(left, (std::set<std::string>{alive, file, "somebody-elses"}));

  bound(dead);
  SdBusOptions options;
  options.runtimeDirectory = directory;
  options.usesHandedOverSocket = false;
  options.usesSessionBus = false;
  SdBusInterprocess second(server_.queues, server_.log, server_.limits, options);
  EXPECT_FALSE(second.listen(kTestService, ipcTestConfiguration(), server_.delegate));
  EXPECT_FALSE(std::filesystem::exists(directory + dead));
}

TEST_F(PrivateSocketTest, SocketsAreOursAloneAndVanish) {
  struct stat status {};
  ASSERT_EQ(::stat(server_.socketPath.c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 0777, 0600u);
  const auto directory = std::filesystem::path(server_.socketPath).parent_path().string();
  ASSERT_EQ(::stat(directory.c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 0777, 0700u);

  auto listener =
      server_.interprocess->makeAnonymousListener(ipcTestConfiguration(), server_.delegate);
  const auto address = listener->address();
  auto client = IpcTestClient(address, false);
  EXPECT_EQ(client.call(kTestInterface, "Echo", "s", "anonymous"), "");
  EXPECT_EQ(client.call("com.quenta.zelkord.Service1", "Open", ""),
            "org.freedesktop.DBus.Error.UnknownInterface");
  listener.reset();
  EXPECT_TRUE(client.isClosed());
  EXPECT_EQ(std::distance(std::filesystem::directory_iterator(directory), {}), 1);
  server_.interprocess.reset();
  EXPECT_TRUE(std::filesystem::is_empty(directory));
}

TEST_F(PrivateSocketTest, OnlyADeadDaemonsSocketIsReplaced) {
  SdBusOptions options;
  options.runtimeDirectory = server_.directory.path() + "/run";
  options.usesHandedOverSocket = false;
  options.usesSessionBus = false;
  SdBusInterprocess second(server_.queues, server_.log, server_.limits, options);
  const auto error = second.listen(kTestService, ipcTestConfiguration(), server_.delegate);
  ASSERT_TRUE(error);
  EXPECT_EQ(error->code, EADDRINUSE);

  const auto stale = server_.directory.path() + "/stale";
  std::filesystem::create_directory(stale);
  sockaddr_un address{.sun_family = AF_UNIX, .sun_path = {}};
  (stale + "/socket").copy(address.sun_path, sizeof(address.sun_path) - 1);
  {
    const Descriptor dead(::socket(AF_UNIX, SOCK_STREAM, 0));
    ASSERT_EQ(::bind(dead.get(), reinterpret_cast<sockaddr*>(&address), sizeof(address)), 0);
  }
  options.runtimeDirectory = stale;
  SdBusInterprocess third(server_.queues, server_.log, server_.limits, options);
  EXPECT_FALSE(third.listen(kTestService, ipcTestConfiguration(), server_.delegate));
}

TEST_F(PrivateSocketTest, OtherUsersAreTurnedAway) {
  if (::geteuid() != 0) GTEST_SKIP() << "needs root to become somebody else";
  for (const auto& path : {server_.directory.path(), server_.directory.path() + "/run"}) {
    ::chmod(path.c_str(), 0755);
  }
  ::chmod(server_.socketPath.c_str(), 0666);
  const auto command =
      "setpriv --reuid 65534 --clear-groups busctl --timeout=2 --address=unix:path=" +
      server_.socketPath + " call " + kTestService + " " + kTestPath + " " + kTestInterface +
      " Echo s hi >/dev/null 2>&1";
  EXPECT_NE(std::system(command.c_str()), 0);
  EXPECT_TRUE(eventually([&] { return server_.log.contains("user 65534 refused"); }));
  EXPECT_EQ(server_.delegate->admitted, 0);
}

TEST_F(PrivateSocketTest, AnswersAfterTheEndGoNowhere) {
  auto client = server_.socketClient();
  ASSERT_EQ(client.call(kTestInterface, "Echo", "s", ""), "");
  std::shared_ptr<Reply> reply;
  std::atomic<bool> taken = false;
  auto connection = server_.delegate->newest();
  connection->setHandler(std::make_shared<IpcTestHandler>([&](const Call& call) {
    reply = call.reply;
    taken = true;
  }));
  client.send(client.newCall("Never"));
  ASSERT_TRUE(eventually([&] { return taken.load(); }));
  server_.interprocess.reset();
  reply->send({});
  connection->invalidate();
  connection->callClient("/", "a.b", "C", "", {}, [](const Error&) {});
  reply.reset();
  EXPECT_TRUE(eventually([&] { return server_.delegate->invalidated == 1; }));
}

TEST(PrivateSocketStressTest, ConnectionsComeCallAndGoFromManyThreads) {
  IpcTestServer server(false);
  ASSERT_FALSE(server.listen());
  const auto listener =
      server.interprocess->makeAnonymousListener(ipcTestConfiguration(), server.delegate);
  constexpr int kThreads = 4;
  constexpr int kRounds = 40;
  constexpr int kCalls = 20;
  std::atomic<int> answered = 0, ended = 0;
  const auto work = [&](const std::string& address) {
    for (int round = 0; round < kRounds; ++round) {
      IpcTestClient client(address, false);
      for (int i = 0; i < kCalls; ++i) {
        answered += client.call(kTestInterface, "Echo", "s", "x").empty();
      }
      client.send(client.newCall(round % 2 == 0 ? "Leave" : "Never"));
    }
    ++ended;
  };
  std::vector<std::thread> threads;
  for (int i = 0; i < kThreads - 1; ++i)
    threads.emplace_back(work, "unix:path=" + server.socketPath);
  threads.emplace_back(work, listener->address());
  while (ended < kThreads) {
    if (const auto connection = server.delegate->newest()) {
      connection->callClient("/client", "a.b", "C", "s", {"x"}, [](const Error&) {});
    }
    server.interprocess->postNotification("stress");
    (void)server.interprocess->statistics();
    std::this_thread::sleep_for(std::chrono::microseconds(200));
  }
  for (auto& thread : threads) thread.join();
  EXPECT_EQ(answered, kThreads * kRounds * kCalls);
  EXPECT_TRUE(eventually([&] { return server.interprocess->statistics().connections == 0; }));
  EXPECT_TRUE(eventually([&] { return server.delegate->begun == server.delegate->invalidated; }));
}

TEST(ExecutableNameTest, IsTheLastPartOfThePath) {
  IpcTestServer server(false);
  const auto own = std::filesystem::read_symlink("/proc/self/exe").filename().string();
  EXPECT_EQ(std::get<std::string>(server.interprocess->executableName(::getpid())), own);
  EXPECT_EQ(std::get<Error>(server.interprocess->executableName(0x7FFFFFFF)).code, ENOENT);
}

}  // namespace
}  // namespace zelkord::ipc
