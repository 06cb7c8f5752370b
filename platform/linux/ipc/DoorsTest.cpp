#include <fcntl.h>
#include <gtest/gtest.h>

#include <chrono>

#include "platform/linux/ipc/BusPresence.h"
#include "platform/linux/ipc/IpcTestSupport.h"
#include "platform/linux/ipc/ListeningSocket.h"
#include "platform/linux/watch/PathWatcher.h"

namespace zelkord::ipc {
namespace {

enum class Door { Bus, Socket, Opened };

// The same behaviour through every door: the bus, the socket, and a connection that was opened over
// the bus.
class DoorsTest : public testing::TestWithParam<Door> {
 protected:
  DoorsTest() { EXPECT_FALSE(server_.listen()); }

  IpcTestClient client() {
    if (GetParam() == Door::Bus) return server_.busClient();
    if (GetParam() == Door::Socket) return server_.socketClient();
    auto opener = server_.busClient();
    EXPECT_EQ(opener.call("com.quenta.zelkord.Service1", "Open", ""), "");
    int handle = -1;
    EXPECT_GE(sd_bus_message_read(opener.reply(), "h", &handle), 0);
    return IpcTestClient(Descriptor(::fcntl(handle, F_DUPFD_CLOEXEC, 3)));
  }
  bool isPrivate() const { return GetParam() != Door::Bus; }

  IpcTestServer server_{true};
};

TEST_P(DoorsTest, EveryCallIsAnsweredOrRefused) {
  auto client = this->client();
  const std::string tooLong(65'537, 'x');
  const std::string error = "org.freedesktop.DBus.Error.";
  const char* known = kTestInterface;
  EXPECT_EQ(client.call(known, "Echo", "s", "text"), "");
  EXPECT_EQ(client.replyText(), "text");
  EXPECT_EQ(client.call(known, "Echo", "s", tooLong.c_str()), error + "LimitsExceeded");
  EXPECT_EQ(client.call(known, "Echo", "x", std::int64_t{1}), error + "InvalidArgs");
  EXPECT_EQ(client.call(known, "Echo", ""), error + "InvalidArgs");
  EXPECT_EQ(client.call(known, "Nothing", ""), error + "UnknownMethod");
  EXPECT_EQ(client.call("com.quenta.zelkord.None1", "Echo", ""), error + "UnknownInterface");
  EXPECT_EQ(client.call(known, "Refuse", ""), "com.quenta.zelkord.Error.Refused");
  EXPECT_EQ(client.call(known, "Silent", ""), "");
  EXPECT_EQ(client.call("org.freedesktop.DBus.Peer", "Ping", ""), "");
  EXPECT_EQ(client.call("org.freedesktop.DBus.Introspectable", "Introspect", ""), "");
  EXPECT_NE(client.replyText().find("name=\"Echo\""), std::string::npos);
  EXPECT_EQ(client.call("org.freedesktop.DBus.Properties", "GetAll", "s", known), "");
  EXPECT_EQ(client.call("org.freedesktop.DBus.Properties", "Get", "ss", known, "P"),
            error + "UnknownProperty");
  EXPECT_EQ(client.call(known, "Dictionary", "a{sv}", 3, "k", "s", "v", "o", "(so)", "a", "/", "k",
                        "x", std::int64_t{1}),
            "");
  EXPECT_EQ(client.replyText(), "k:x o:(so) ");
  EXPECT_EQ(client.call(known, "Handle", ""), "");
  EXPECT_EQ(server_.interprocess->statistics().connections, 1u);
  EXPECT_EQ(server_.interprocess->statistics().refused, 6u);
}

TEST_P(DoorsTest, TheHandlerHearsOfEveryMessage) {
  auto client = this->client();
  const std::string tooLong(65'537, 'x');
  ASSERT_EQ(client.call(kTestInterface, "Echo", "s", "begin"), "");
  const std::pair<const char*, std::function<void()>> cases[] = {
      {"Peer", [&] { client.call("org.freedesktop.DBus.Peer", "Ping", ""); }},
      {"Introspectable",
       [&] { client.call("org.freedesktop.DBus.Introspectable", "Introspect", ""); }},
      {"Properties",
       [&] { client.call("org.freedesktop.DBus.Properties", "GetAll", "s", kTestInterface); }},
      {"wrong signature", [&] { client.call(kTestInterface, "Echo", ""); }},
      {"unknown member", [&] { client.call(kTestInterface, "Nothing", ""); }},
      {"over a limit", [&] { client.call(kTestInterface, "Echo", "s", tooLong.c_str()); }},
      {"signal", [&] { client.send(client.newSignal()); }},
  };
  int expected = server_.delegate->otherMessages;
  for (const auto& [name, send] : cases) {
    SCOPED_TRACE(name);
    send();
    ++expected;
    EXPECT_TRUE(client.processUntil([&] { return server_.delegate->otherMessages == expected; }));
  }
  EXPECT_EQ(server_.delegate->calls, 1);
}

TEST_P(DoorsTest, NoncharactersArriveAsReplacementCharacters) {
  server_.delegate->onCall = [](const Call& call, const auto&) {
    if (call.member == "Echo") {
      call.reply->send(
          {"a\xEF\xBF\xBE \xEF\xB7\x90 \xEF\xB7\xAF \xF0\x9F\xBF\xBF \xF4\x8F\xBF\xBEz"});
    } else {
      call.reply->fail("com.quenta.zelkord.Error.Refused", "no \xEF\xBF\xBF");
    }
  };
  auto client = this->client();
  const std::string replaced = "\xEF\xBF\xBD";
  EXPECT_EQ(client.call(kTestInterface, "Echo", "s", ""), "");
  EXPECT_EQ(client.replyText(), "a" + replaced + " " + replaced + " " + replaced + " " + replaced +
                                    " " + replaced + "z");
  EXPECT_EQ(client.call(kTestInterface, "Refuse", ""), "com.quenta.zelkord.Error.Refused");
}

TEST_P(DoorsTest, TheDaemonKnowsWhoCallsAndCallsBack) {
  auto client = this->client();
  std::string heard;
  const auto take = [](sd_bus_message* m, void* to, sd_bus_error*) {
    const char* text = "";
    if (sd_bus_message_read(m, "s", &text) > 0) *static_cast<std::string*>(to) = text;
    return 1;
  };
  sd_bus_slot* slot = nullptr;
  const sd_bus_vtable table[] = {
      SD_BUS_VTABLE_START(0),
      SD_BUS_METHOD("BagDidLoad", "s", "", take, SD_BUS_VTABLE_UNPRIVILEGED), SD_BUS_VTABLE_END};
  ASSERT_GE(sd_bus_add_object_vtable(client.bus(), &slot, "/com/quenta/zelkord/client",
                                     "com.quenta.zelkord.Client1", table, &heard),
            0);
  const SlotPtr owned(slot);
  ASSERT_EQ(client.call(kTestInterface, "CallBack", "s", "bag"), "");
  EXPECT_TRUE(client.processUntil([&] { return heard == "bag"; }));
  const auto connection = server_.delegate->newest();
  ASSERT_TRUE(connection);
  EXPECT_EQ(connection->peer().pid, ::getpid());
  EXPECT_EQ(connection->peer().uid, ::getuid());
}

TEST_P(DoorsTest, AClientThatLeavesEndsItsConnection) {
  {
    auto client = this->client();
    ASSERT_EQ(client.call(kTestInterface, "Echo", "s", ""), "");
    client.send(client.newCall("Never"));
    sd_bus_flush(client.bus());
  }
  EXPECT_TRUE(eventually([&] { return server_.delegate->invalidated == 1; }));
  EXPECT_TRUE(eventually([&] { return server_.interprocess->statistics().connections == 0; }));
  EXPECT_TRUE(eventually([&] { return server_.delegate->placesTaken == 0; }));
  EXPECT_TRUE(eventually([&] { return server_.delegate->newest() == nullptr; }));
}

TEST_P(DoorsTest, AnInvalidatedClientIsToldAndItsCallsStayUnanswered) {
  auto client = this->client();
  bool told = false;
  const auto take = [](sd_bus_message*, void* to, sd_bus_error*) {
    *static_cast<bool*>(to) = true;
    return 0;
  };
  sd_bus_slot* slot = nullptr;
  sd_bus_match_signal(client.bus(), &slot, nullptr, kTestPath, kTestInterface, "Invalidated", take,
                      &told);
  const SlotPtr owned(slot);
  ASSERT_EQ(client.call(kTestInterface, "Echo", "s", ""), "");
  client.send(client.newCall("Never"));
  client.send(client.newCall("Leave"));
  if (isPrivate()) {
    EXPECT_TRUE(client.isClosed());
    EXPECT_FALSE(told);
  } else {
    EXPECT_TRUE(client.processUntil([&] { return told; }));
    EXPECT_EQ(client.call(kTestInterface, "Echo", "s", "again"), "");
    EXPECT_EQ(server_.delegate->begun, 2);
  }
  EXPECT_TRUE(eventually([&] { return server_.delegate->invalidated == 1; }));
}

TEST_P(DoorsTest, CallsUnderWayAreBounded) {
  auto client = this->client();
  int refused = 0;
  const auto count = [](sd_bus_message* m, void* to, sd_bus_error*) {
    *static_cast<int*>(to) +=
        sd_bus_message_is_method_error(m, "org.freedesktop.DBus.Error.LimitsExceeded");
    return 1;
  };
  ASSERT_EQ(client.call(kTestInterface, "Echo", "s", ""), "");
  std::shared_ptr<std::vector<Call>> kept = std::make_shared<std::vector<Call>>();
  server_.delegate->newest()->setHandler(
      std::make_shared<IpcTestHandler>([kept](Call call) { kept->push_back(std::move(call)); }));
  for (int i = 0; i < 1030; ++i) {
    const auto call = client.newCall("Never");
    sd_bus_call_async(client.bus(), nullptr, call.get(), count, &refused, 0);
  }
  EXPECT_TRUE(client.processUntil([&] { return refused == 6; }));
}

std::string doorName(const testing::TestParamInfo<Door>& info) {
  constexpr const char* kNames[] = {"Bus", "Socket", "Opened"};
  return kNames[static_cast<int>(info.param)];
}
INSTANTIATE_TEST_SUITE_P(All, DoorsTest, testing::Values(Door::Bus, Door::Socket, Door::Opened),
                         doorName);

TEST(BusDoorTest, OnlyTheConnectionInterfaceBeginsAConnection) {
  IpcTestServer server(true);
  ASSERT_FALSE(server.listen());
  auto client = server.busClient();
  EXPECT_EQ(client.call(kTestSharedInterface, "Status", ""), "");
  EXPECT_EQ(client.replyText(), "shared");
  EXPECT_EQ(server.delegate->begun, 0);
  EXPECT_EQ(client.call(kTestInterface, "Echo", "s", ""), "");
  EXPECT_EQ(server.delegate->begun, 1);
  EXPECT_EQ(client.call(kTestSharedInterface, "Status", ""), "");
  EXPECT_EQ(client.replyText(), "connected");
}

// sd-bus sends no such text; the bus lets it pass.
TEST(BusDoorTest, ANoncharacterInACallIsAnsweredWithInvalidArgs) {
  IpcTestServer server(true);
  ASSERT_FALSE(server.listen());
  for (const std::string character : {"fffe", "ffff", "fdd0", "0010ffff"}) {
    SCOPED_TRACE(character);
    const auto escape = (character.size() == 4 ? "\\u" : "\\U") + character;
    const auto answer = server.directory.path() + "/answer";
    const auto command = "gdbus call --timeout 10 --address " + server.bus->address() + " -d " +
                         kTestService + " -o " + kTestPath + " -m " + kTestInterface +
                         ".Echo \"'x" + escape + "'\" 2>" + answer;
    EXPECT_NE(std::system(command.c_str()), 0);
    std::ifstream file(answer);
    const std::string text{std::istreambuf_iterator<char>(file), {}};
    EXPECT_NE(text.find("InvalidArgs"), std::string::npos) << text;
  }
  EXPECT_EQ(server.interprocess->statistics().refused, 4u);
}

TEST(BusDoorTest, ANameOrSocketThatIsTakenFailsAndLeavesTheOtherOnesAlone) {
  IpcTestServer server(true);
  ASSERT_FALSE(server.listen());
  for (const auto& [folder, code] : {std::pair{"/other", EEXIST}, {"/run", EADDRINUSE}}) {
    SdBusOptions options;
    options.runtimeDirectory = server.directory.path() + folder;
    options.usesHandedOverSocket = false;
    options.sessionBusAddress = server.bus->address();
    SdBusInterprocess second(server.queues, server.log, server.limits, options);
    const auto error = second.listen(kTestService, ipcTestConfiguration(), server.delegate);
    ASSERT_TRUE(error);
    EXPECT_EQ(error->code, code);
  }
  EXPECT_FALSE(std::filesystem::exists(server.directory.path() + "/other/socket"));
  auto client = server.socketClient();
  EXPECT_EQ(client.call(kTestInterface, "Echo", "s", ""), "");
}

// As when the bus has hung: the socket is served all the same, and soon.
TEST(BusDoorTest, ABusThatAcceptsAndDoesNotAnswerDoesNotHoldUpTheStart) {
  const IpcTestDirectory directory;
  const auto deaf = ListeningSocket::make(directory.path() + "/bus");
  ASSERT_TRUE(std::holds_alternative<ListeningSocket>(deaf));
  IpcTestServer server(false, [&](SdBusOptions& options) {
    options.usesSessionBus = true;
    options.sessionBusAddress = "unix:path=" + directory.path() + "/bus";
  });
  const auto begin = std::chrono::steady_clock::now();
  EXPECT_FALSE(server.listen());
  EXPECT_LT(std::chrono::steady_clock::now() - begin, 5s);
  auto client = server.socketClient();
  EXPECT_EQ(client.call(kTestInterface, "Echo", "s", ""), "");
}

// Whoever waits for the name and then takes the socket must find it there.
TEST(BusDoorTest, TheNameIsNotSeenBeforeTheSocketListens) {
  IpcTestServer server(true, [](SdBusOptions& options) {
    options.socketName = std::string(200, 'x');  // none can be made
  });
  auto watcher = server.busClient();
  int changes = 0;
  const auto count = [](sd_bus_message*, void* to, sd_bus_error*) {
    ++*static_cast<int*>(to);
    return 0;
  };
  const char* rule = "type='signal',member='NameOwnerChanged',arg0='com.quenta.zelkord'";
  ASSERT_GE(sd_bus_add_match(watcher.bus(), nullptr, rule, count, &changes), 0);
  EXPECT_TRUE(server.listen());
  // Whatever came before the answer is here with it.
  EXPECT_GE(sd_bus_call_method(watcher.bus(), "org.freedesktop.DBus", "/org/freedesktop/DBus",
                               "org.freedesktop.DBus", "GetId", nullptr, nullptr, ""),
            0);
  while (sd_bus_process(watcher.bus(), nullptr) > 0) {
  }
  EXPECT_EQ(changes, 0);
}

TEST(BusDoorTest, WithoutABusTheSocketIsServed) {
  IpcTestServer server(false, [](SdBusOptions& options) {
    options.usesSessionBus = true;
    options.sessionBusAddress = "unix:path=/nonexistent/bus";
  });
  ASSERT_FALSE(server.listen());
  EXPECT_EQ(server.log.count(LogLevel::Error), 1);
  auto client = server.socketClient();
  EXPECT_EQ(client.call(kTestInterface, "Echo", "s", ""), "");
}

TEST(BusDoorTest, ABusThatGoesAwayEndsItsClientsOnly) {
  IpcTestServer server(true);
  ASSERT_FALSE(server.listen());
  auto onBus = server.busClient();
  auto onSocket = server.socketClient();
  ASSERT_EQ(onBus.call(kTestInterface, "Echo", "s", ""), "");
  ASSERT_EQ(onSocket.call(kTestInterface, "Echo", "s", ""), "");
  server.bus->stop();
  EXPECT_TRUE(eventually([&] { return server.delegate->invalidated == 1; }));
  server.interprocess->postNotification("com.quenta.test");
  EXPECT_EQ(onSocket.call(kTestInterface, "Echo", "s", ""), "");
}

TEST(BusDoorTest, ABusThatComesBackIsJoinedAgain) {
  for (const bool watches : {true, false}) {
    SCOPED_TRACE(watches);
    RecordingLog log;
    Loop host("test-host");
    PathWatcher watcher(host, log);
    IpcTestServer server(true, [&](SdBusOptions& options) {
      if (watches) options.watcher = &watcher;
    });
    ASSERT_FALSE(server.listen());
    auto onSocket = server.socketClient();
    ASSERT_EQ(onSocket.call(kTestInterface, "Echo", "s", ""), "");
    for (int i = 0; i < 2; ++i) {
      server.bus->stop();
      ASSERT_TRUE(eventually([&] { return server.log.count(LogLevel::Error) == i + 1; }));
      server.bus->start();
      ASSERT_TRUE(eventually([&] {
        auto onBus = server.busClient();
        return onBus.call(kTestInterface, "Echo", "s", "").empty();
      }));
      EXPECT_EQ(onSocket.call(kTestInterface, "Echo", "s", ""), "");
    }
    EXPECT_EQ(server.log.count(LogLevel::Error), 2);
    server.interprocess.reset();
  }
}

TEST(BusDoorTest, ABusThatComesLateIsJoinedAndItsNameTakenWhenItIsFree) {
  RecordingLog log;
  Loop host("test-host");
  PathWatcher watcher(host, log);
  IpcTestDirectory directory;
  IpcTestBus bus(directory.path());
  const auto alias = directory.path() + "/alias";
  std::optional<IpcTestClient> owner(std::in_place, bus.address(), true);
  ASSERT_GE(sd_bus_request_name(owner->bus(), kTestService, 0), 0);
  IpcTestServer server(false, [&](SdBusOptions& options) {
    options.usesSessionBus = true;
    options.sessionBusAddress = "unix:path=" + alias;
    options.watcher = &watcher;
  });
  ASSERT_FALSE(server.listen());
  std::filesystem::create_symlink(bus.socket(), alias);
  EXPECT_TRUE(eventually([&] { return server.log.contains("is taken on the session bus"); }));
  owner.reset();
  EXPECT_TRUE(eventually([&] { return server.log.contains("is served on the session bus"); }));
  IpcTestClient client(bus.address(), true);
  EXPECT_EQ(client.call(kTestInterface, "Echo", "s", ""), "");
  EXPECT_EQ(server.log.count(LogLevel::Error), 2);  // no bus, then the name
  server.interprocess.reset();
}

TEST(BusDoorTest, WhatABusDoesNotReadIsBounded) {
  IpcTestServer server(true);
  ASSERT_FALSE(server.listen());
  server.bus->signal(SIGSTOP);
  const std::string key = "com.quenta.zelkord.limit.bus_messages";
  auto onSocket = server.socketClient();
  for (int i = 0; i < 400 && server.counters.value(key) == 0; ++i) {
    for (int j = 0; j < 200; ++j) server.interprocess->postNotification("com.quenta.test");
    EXPECT_EQ(onSocket.call(kTestInterface, "Echo", "s", ""), "");  // all of them are sent by then
  }
  EXPECT_GT(server.counters.value(key), 0);
  server.bus->signal(SIGCONT);
  auto client = server.busClient();
  EXPECT_EQ(client.call(kTestInterface, "Echo", "s", ""), "");
}

TEST(BusPresenceTest, WaitsLongerAfterEachAttemptAndKnowsTheSocketOfAnAddress) {
  for (const auto& [attempts, delay] : {std::pair{0, Duration(100ms)},
                                        {1, Duration(200ms)},
                                        {9, Duration(51'200ms)},
                                        {10, Duration(60s)},
                                        {1'000'000, Duration(60s)}}) {
    EXPECT_EQ(rejoinDelay(attempts), delay) << attempts;
  }
  const std::pair<std::string, std::string> addresses[] = {
      {"unix:path=/run/user/1/bus", "/run/user/1/bus"},
      {"unix:path=/a%20b%2fc,guid=7;unix:path=/other", "/a b/c"},
      {"unix:path=/cut%2", "/cut%2"},
      {"unix:abstract=/x", ""},
      {"", ""}};
  for (const auto& [address, path] : addresses) EXPECT_EQ(socketPathOf(address), path) << address;
}

TEST(BusDoorTest, NotificationsReachTheBusAndPrivateConnections) {
  IpcTestServer server(true);
  ASSERT_FALSE(server.listen());
  const auto take = [](sd_bus_message* m, void* to, sd_bus_error*) {
    const char* name = "";
    if (sd_bus_message_read(m, "s", &name) > 0) *static_cast<std::string*>(to) += name;
    return 0;
  };
  auto onBus = server.busClient();
  auto onSocket = server.socketClient();
  std::string heard[2];
  sd_bus_slot* slots[2] = {};
  IpcTestClient* clients[] = {&onBus, &onSocket};
  for (int i = 0; i < 2; ++i) {
    sd_bus_match_signal(clients[i]->bus(), &slots[i], nullptr, kTestPath,
                        "com.quenta.zelkord.Notification1", "Posted", take, &heard[i]);
    ASSERT_EQ(clients[i]->call(kTestInterface, "Echo", "s", ""), "");
  }
  server.interprocess->postNotification("com.quenta.test");
  for (int i = 0; i < 2; ++i) {
    EXPECT_TRUE(clients[i]->processUntil([&] { return heard[i] == "com.quenta.test"; })) << i;
    sd_bus_slot_unref(slots[i]);
  }
}

}  // namespace
}  // namespace zelkord::ipc
