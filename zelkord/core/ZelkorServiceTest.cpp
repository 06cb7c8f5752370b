#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <csignal>

#include "corezelkor/Constants.h"
#include "platform/testing/PlatformOnQueues.h"
#include "zelkord/assembly/NotificationNames.h"
#include "zelkord/core/ClientStateManager.h"
#include "zelkord/core/CommandLine.h"
#include "zelkord/core/DaemonTestSupport.h"
#include "zelkord/core/ZelkorService.h"
#include "zelkord/feedback/RecordingSessions.h"

namespace zelkord {
namespace {

TEST(ZelkorServiceTest, CountsConnectionsOfOneProcess) {
  DaemonBed bed;
  const auto first = bed.connect();
  EXPECT_FALSE(bed.fakes.log.contains("too many connections"));
  const auto second = bed.connect();
  EXPECT_TRUE(bed.fakes.log.contains("too many connections 2 from pid 100"));
  EXPECT_EQ(second->state(), ipc::FakeClient::State::Open);
  EXPECT_EQ(bed.fakes.counters.all()["com.quenta.zelkord.clientconnection"], 2);
}

TEST(ZelkorServiceTest, NamesTheClientByItsProgram) {
  DaemonBed bed;
  bed.connect(100);
  bed.connect(101);
  EXPECT_TRUE(bed.fakes.log.contains("new connection from shell (100)"));
  EXPECT_TRUE(bed.fakes.log.contains("error getting path for pid [101] No such file or directory"));
}

TEST(ZelkorServiceTest, PurgesTheURLCacheWhenTheLastConnectionGoes) {
  DaemonBed bed;
  const auto first = bed.connectAndConfigure("lanthe", 1);
  const auto second = bed.connectAndConfigure("brelin", 2);
  first->disconnect();
  bed.run();
  EXPECT_EQ(bed.urlSession().purges(), 0);
  second->disconnect();
  bed.run();
  EXPECT_EQ(bed.urlSession().purges(), 1);
  EXPECT_TRUE(bed.fakes.log.contains("connection from (null) (2) invalidated"));
  EXPECT_EQ(bed.fakes.counters.all()["com.quenta.zelkord.brelin.xcpinvalidation"], 1);
  EXPECT_THAT(bed.fakes.transactions.openNames(),
              testing::Not(testing::Contains("clientConnection")));
}

TEST(ZelkorServiceTest, GivesFreeMemoryBackOnceForAllWhoLeaveWithinASecond) {
  DaemonBed bed;
  const auto stays = bed.connect(1);
  for (int round = 1; round <= 2; ++round) {
    const auto first = bed.connect(2);
    const auto second = bed.connect(3);
    first->disconnect();
    second->disconnect();
    bed.run();
    EXPECT_EQ(bed.fakes.process.releases(), round - 1);
    bed.fakes.timeline.advance(1s);
    EXPECT_EQ(bed.fakes.process.releases(), round);
  }
  stays->disconnect();
  bed.run();
  EXPECT_EQ(bed.fakes.process.releases(), 3) << "at once when the last one leaves";
  bed.fakes.timeline.advance(5s);
  EXPECT_EQ(bed.fakes.process.releases(), 4) << "and again when its work has ended";
}

TEST(ZelkorServiceTest, TellsWhetherAClientsSessionEndedWithIt) {
  for (const bool shared : {true, false}) {
    SCOPED_TRACE(shared);
    DaemonBed bed(json::object{{"ZLKSharedSession", shared}});
    bed.connectAndConfigure()->disconnect();
    bed.run();
    EXPECT_TRUE(bed.fakes.log.contains(shared ? "session not flushed on invalidation"
                                              : "session flushed on invalidation"));
  }
}

TEST(WireTest, JsonInMessagesHoldsNoNoncharacters) {
  const std::pair<std::string, std::string> cases[] = {
      {"\xEF\xBF\xBE", "\\ufffe"},
      {"a\xEF\xB7\x90z", "a\\ufdd0z"},
      {"\xF0\x9F\xBF\xBF", "\\ud83f\\udfff"},
      {"\xF4\x8F\xBF\xBE", "\\udbff\\udffe"},
      {"\xEF\xBF\xBD \xEF\xB6\x90 \xF0\x9F\x98\x80", "\xEF\xBF\xBD \xEF\xB6\x90 \xF0\x9F\x98\x80"},
  };
  for (const auto& [text, expected] : cases) {
    SCOPED_TRACE(expected);
    DaemonBed bed;
    bed.installBag(R"({"version":"4","note":")" + text + R"("})");
    const auto client = bed.connectAndConfigure();
    const auto answer = bed.call(client, "Bag");
    const auto& bag = answer->values.at(0).get<ipc::Dictionary>()->at("rawBag");
    EXPECT_THAT(*bag.get<std::string>(), testing::HasSubstr("\"note\":\"" + expected + "\""));
  }
}

TEST(ClientStateManagerTest, ConnectionsOfOneClientShareItsState) {
  DaemonBed bed;
  bed.connectAndConfigure("lanthe", 1);
  bed.connectAndConfigure("lanthe", 2);
  auto& manager = *bed.daemon.assembly().clientStateManager();
  EXPECT_EQ(manager.states().size(), 1u);
  EXPECT_EQ(manager.sessions().size(), 1u);
  EXPECT_EQ(manager.sessions()[0].at("identifier"), "lanthe");
}

TEST(ClientStateManagerTest, RemembersClientsOnlyWhenToldTo) {
  for (const bool persists : {false, true}) {
    SCOPED_TRACE(persists);
    FakePlatform fakes;
    if (persists) fakes.settings.set("ZLKPersistSessions", true);
    fakes.settings.set("sessions", json::array{{{"identifier", "brelin"}, {"agent", "Brelin/1"}},
                                               {{"identifier", "silent"}},
                                               7,
                                               {{"agent", "nobody"}}});
    Daemon daemon(fakes.platform());
    daemon.start();
    fakes.timeline.runUntilIdle();
    auto& manager = *daemon.assembly().clientStateManager();
    EXPECT_EQ(manager.states().size(), persists ? 2u : 0u);
    EXPECT_EQ(manager.sessions().size(), persists ? 1u : 0u);
    manager.stateForClientIdentifier("lanthe")->setUserAgent("Lanthe/9");
    const auto flushes = fakes.settings.flushes();
    for (int i = 0; i < 5; ++i) manager.saveState();
    fakes.timeline.runUntilIdle();
    EXPECT_EQ(fakes.settings.value("sessions")->as_array().size(), persists ? 2u : 4u);
    EXPECT_EQ(fakes.settings.flushes() - flushes, persists ? 1 : 0);
    manager.stateForClientIdentifier("vocari")->setUserAgent("Vocari/1");
    manager.saveState();
    fakes.timeline.runUntilIdle();
    EXPECT_EQ(fakes.settings.value("sessions")->as_array().size(), persists ? 3u : 4u);
  }
}

TEST(ClientStateManagerTest, RestoresOnlySoManyClients) {
  FakePlatform fakes;
  fakes.settings.set("ZLKPersistSessions", true);
  json::array sessions;
  for (int i = 0; i < 2000; ++i)
    sessions.push_back(json::object{{"identifier", std::to_string(i)}});
  fakes.settings.set("sessions", sessions);
  Daemon daemon(fakes.platform());
  daemon.start();
  fakes.timeline.runUntilIdle();
  auto& manager = *daemon.assembly().clientStateManager();
  EXPECT_EQ(manager.states().size(), 1024u);
  EXPECT_TRUE(manager.admit("lanthe", "Lanthe/9", 1));
}

TEST(EndpointTest, AdmitsTenAtATimeAndLetsTheNextWaitShortly) {
  DaemonBed bed;
  const auto address = bed.daemon.assembly().clientStateManager()->endpoint();
  std::vector<DaemonBed::Client> clients;
  for (int i = 0; i < 10; ++i) clients.push_back(bed.fakes.interprocess.connect(address));
  bed.run();
  const auto refused = bed.fakes.interprocess.connect(address);
  bed.fakes.timeline.advance(99ms);
  EXPECT_EQ(refused->state(), ipc::FakeClient::State::Deciding);
  bed.fakes.timeline.advance(1ms);
  EXPECT_EQ(refused->state(), ipc::FakeClient::State::Refused);
  EXPECT_TRUE(bed.fakes.log.contains("endpoint semaphore timeout"));

  const auto waiting = bed.fakes.interprocess.connect(address);
  bed.fakes.timeline.advance(50ms);
  clients.front()->disconnect();
  bed.run();
  EXPECT_EQ(waiting->state(), ipc::FakeClient::State::Open);
  EXPECT_TRUE(bed.fakes.log.contains("endpoint connection invalidated"));
}

TEST(EndpointTest, KnowsOnlyClientsThatConfiguredThemselves) {
  DaemonBed bed;
  bed.connectAndConfigure("lanthe");
  auto& manager = *bed.daemon.assembly().clientStateManager();
  const auto client = bed.fakes.interprocess.connect(manager.endpoint());
  bed.run();
  const auto ask = [&](const std::string& kind, const std::string& identifier) {
    auto answer = client->call(std::string(kEndpointInterface), "Request",
                               {kind, ipc::Dictionary{{"queryId", std::int64_t{9}}},
                                ipc::Dictionary{{"identifier", identifier}, {"userAgent", "x"}}});
    bed.run();
    return answer;
  };
  for (const auto* identifier : {"", "unknown"}) {
    for (const auto* kind : {"search", "moreResults", "card", "zeroKeyword", "lookup",
                             "flightLookup", "flightSearch"}) {
      SCOPED_TRACE(kind);
      const auto answer = ask(kind, identifier);
      ASSERT_TRUE(answer->answered);
      EXPECT_EQ(*answer->values[0].get<std::int64_t>(), 9);
      EXPECT_THAT(reasonIn(*answer, 2), testing::StartsWith("invalid configuration {"));
    }
    EXPECT_FALSE(ask("nonsense", identifier)->answered);
  }
  EXPECT_TRUE(bed.fakes.log.contains("client session identifier cannot be nil or empty"));
  EXPECT_FALSE(ask("search", "lanthe")->answered);
  EXPECT_EQ(manager.states().size(), 1u);
}

TEST(EndpointTest, AnswersMoreResultsAndCardsAsTheClientThatIsNamed) {
  DaemonBed bed;
  bed.installBag(kServedBag);
  const auto sessions = std::make_shared<RecordingSessionManager>("zelkor", true);
  bed.daemon.assembly().clientSessionManager.set(sessions);
  bed.connectAndConfigure("lanthe");
  auto& manager = *bed.daemon.assembly().clientStateManager();
  const auto client = bed.fakes.interprocess.connect(manager.endpoint());
  std::set<std::string> uuids;
  for (const auto& [kind, isServed] :
       std::vector<std::pair<std::string, bool>>{{"moreResults", true},
                                                 {"card", true},
                                                 {"search", false},
                                                 {"zeroKeyword", false},
                                                 {"lookup", false},
                                                 {"flightLookup", false},
                                                 {"flightSearch", false}}) {
    SCOPED_TRACE(kind);
    bed.fakes.log.clear();
    const auto answer =
        client->call(std::string(kEndpointInterface), "Request",
                     {kind,
                      ipc::Dictionary{{"queryId", std::int64_t{-9}},
                                      {"moreResultsURL", "https://m.example/?q=a"},
                                      {"cardURL", "https://c.example/"}},
                      ipc::Dictionary{{"identifier", "lanthe"}, {"userAgent", "Other/1"}}});
    bed.run();
    EXPECT_TRUE(bed.fakes.log.contains("using client state: lanthe"));
    EXPECT_FALSE(answer->answered);
    ASSERT_EQ(bed.urlSession().pending().size(), isServed ? 1u : 0u);
    if (!isServed) continue;
    const auto task = bed.urlSession().pending().back();
    EXPECT_THAT(task->request().header("User-Agent").value_or(""), testing::EndsWith("Lanthe/9"));
    task->succeed(200, "[7]");
    bed.run();
    ASSERT_TRUE(answer->answered);
    EXPECT_EQ(*answer->values[0].get<std::int64_t>(), -9);
    EXPECT_EQ(answer->values[1].get<ipc::Dictionary>()->at("data").get<Data>()->view(), "[7]");
    const auto records = sessions->records().all();
    const auto& end = dynamic_cast<const NetworkSearchEnd&>(*records.back().feedback);
    const auto& start =
        dynamic_cast<const NetworkSearchStart&>(*records.at(records.size() - 2).feedback);
    EXPECT_EQ(end.uuid, start.uuid);
    EXPECT_EQ(start.uuid->size(), 36u);
    EXPECT_TRUE(uuids.insert(*start.uuid).second);
  }
  EXPECT_EQ(manager.sessions().at(0).at("agent").find("Other/1"), std::string::npos);
}

TEST(DaemonTest, BuildsTheGraphAnnouncesItselfAndLeavesOnSignals) {
  for (const auto& [number, text] : {std::pair{SIGTERM, "SIGTERM"}, {SIGINT, "SIGINT"}}) {
    SCOPED_TRACE(text);
    FakePlatform fakes;
    int started = 0;
    const auto observation = fakes.notificationCenter.observe(
        std::string(kZLKStartup), [&](const Notification&) { ++started; });
    Daemon daemon(fakes.platform());
    EXPECT_FALSE(daemon.start());
    EXPECT_EQ(started, 0);
    fakes.timeline.runUntilIdle();
    EXPECT_EQ(started, 1);
    EXPECT_EQ(fakes.counters.all()["com.quenta.zelkord.launch"], 1);
    EXPECT_TRUE(daemon.assembly().useMorvane());
    EXPECT_TRUE(daemon.assembly().sharedSession());
    EXPECT_EQ(fakes.urlSessions.find("bagSession")->tasks().size(), 1u);
    fakes.signals.raise(number);
    fakes.timeline.runUntilIdle();
    EXPECT_EQ(fakes.process.exitStatus(), 0);
    EXPECT_TRUE(fakes.log.contains(text));
  }
}

// The timeline's queues, which note the order in which components make theirs.
class LabelledQueues final : public WorkQueues {
 public:
  explicit LabelledQueues(WorkQueues& queues) : queues_(queues) {}

  std::unique_ptr<SerialQueue> makeSerialQueue(std::string label,
                                               QualityOfService quality) override {
    labels.push_back(label);
    return queues_.makeSerialQueue(std::move(label), quality);
  }
  std::unique_ptr<ConcurrentQueue> makeConcurrentQueue(std::string label) override {
    labels.push_back(label);
    return queues_.makeConcurrentQueue(std::move(label));
  }
  WorkQueue& global(QualityOfService quality) override { return queues_.global(quality); }
  SerialQueue& main() override { return queues_.main(); }
  std::unique_ptr<Semaphore> makeSemaphore(unsigned permits) override {
    return queues_.makeSemaphore(permits);
  }
  std::unique_ptr<Group> makeGroup() override { return queues_.makeGroup(); }
  std::unique_ptr<Timer> makeTimer(WorkQueue& queue, Task task) override {
    return queues_.makeTimer(queue, std::move(task));
  }

  std::vector<std::string> labels;

 private:
  WorkQueues& queues_;
};

TEST(DaemonTest, MakesItsServicesInTheRequiredOrder) {
  FakePlatform fakes;
  LabelledQueues queues(fakes.timeline);
  Platform platform =
      onQueues(fakes.platform(), fakes.timeline, queues, fakes.urlSessions, fakes.transactions);
  Daemon daemon(platform);
  EXPECT_FALSE(daemon.start());
  std::size_t last = 0;
  for (const char* label :
       {"com.quenta.zelkord.bagcontroller.cacheaccess", "com.quenta.zelkord.contextaccess",
        "com.quenta.zelkord.persistentStorageQueue", "com.quenta.zelkord.stateCache",
        "com.quenta.zelkor.serviceQueue", "com.quenta.zelkord.clientSessionManagerQueue",
        "com.quenta.zelkord.xpc_event"}) {
    const auto found = std::find(queues.labels.begin(), queues.labels.end(), label);
    ASSERT_NE(found, queues.labels.end()) << label;
    const auto place = static_cast<std::size_t>(found - queues.labels.begin());
    EXPECT_GE(place, last) << label;
    last = place;
  }
}

TEST(DaemonTest, LeavesAlthoughWhatIsRecordedIsNotFinished) {
  FakePlatform fakes;
  Daemon daemon(fakes.platform());
  ASSERT_FALSE(daemon.start());
  fakes.timeline.runUntilIdle();
  const auto hanging = std::make_shared<RecordingSessionManager>("zelkor", true);
  std::optional<int> before, after;
  hanging->whileWaiting = [&] {
    fakes.timeline.advance(600ms);
    before = fakes.process.exitStatus();
    fakes.timeline.advance(200ms);
    after = fakes.process.exitStatus();
  };
  daemon.assembly().clientSessionManager.set(hanging);
  fakes.signals.raise(SIGTERM);
  fakes.signals.raise(SIGINT);  // somebody is impatient
  fakes.timeline.runUntilIdle();
  EXPECT_EQ(before, std::nullopt);
  EXPECT_EQ(after, 0);
}

TEST(DaemonTest, DoesNotServeWithoutItsName) {
  FakePlatform fakes;
  fakes.interprocess.setListenError(zelkorError(500, "taken"));
  Daemon daemon(fakes.platform());
  EXPECT_EQ(daemon.start(), zelkorError(500, "taken"));
}

TEST(DaemonTest, SetsTheSwitchesOfTheQuerySession) {
  for (const bool noParallax : {false, true}) {
    FakePlatform fakes;
    fakes.settings.set("ZLKNoParallax", noParallax);
    Assembly assembly(fakes.platform());
    EXPECT_EQ(&assembly.urlSession(), &assembly.urlSession());
    assembly.bagSession();
    const auto& query = fakes.urlSessions.find("urlSession")->configuration();
    EXPECT_EQ(query.tcpFastOpen, noParallax ? std::nullopt : std::optional(true));
    EXPECT_EQ(query.tlsSessionTickets, noParallax ? std::nullopt : std::optional(true));
    const auto& bag = fakes.urlSessions.find("bagSession")->configuration();
    EXPECT_FALSE(bag.tcpFastOpen || bag.tlsSessionTickets || bag.cache);
  }
}

TEST(DaemonTest, TracesOnlyWhenSwitchedOn) {
  for (const bool enabled : {false, true}) {
    FakePlatform fakes;
    fakes.settings.set("TraceEnabled", enabled);
    Daemon daemon(fakes.platform());
    daemon.start();
    fakes.timeline.runUntilIdle();
    const auto client = fakes.interprocess.connect();
    fakes.timeline.runUntilIdle();
    client->call(std::string(kDaemonInterface), "Request", {"search", ipc::Dictionary{}});
    fakes.timeline.runUntilIdle();
    const auto expected =
        enabled ? std::vector<std::uint32_t>{0x2B000004, 0x2B000008} : std::vector<std::uint32_t>{};
    EXPECT_EQ(fakes.trace.take(), expected);
    EXPECT_TRUE(fakes.log.contains(enabled ? "ZLKTraceEnabled flag set to 1"
                                           : "ZLKTraceEnabled flag set to 0"));
    fakes.interprocess.disconnectAll();
    fakes.timeline.runUntilIdle();
  }
}

TEST(ZelkorLoggingDeathTest, RefusesACategoryOutsideTheTable) {
  RecordingLog log;
  const ZelkorLogging logging(log);
  EXPECT_EQ(ZelkorLogForCategory(logging, 9).category(), "Zelkor_LookUp");
  EXPECT_EQ(ZelkorLogForCategory(logging, 18).category(), "Zelkor_Feedback_Storage");
  EXPECT_DEATH(ZelkorLogForCategory(logging, 19), "category < ZelkorLoggingCategoryCount");
}

TEST(CommandLineTest, ReadsEachOptionAndRefusesTheRest) {
  struct Case {
    std::vector<std::string> arguments;
    bool valid;
  };
  const std::vector<Case> cases = {
      {{}, true},
      {{"--log-file", "/tmp/x", "--log-level=debug", "--exit-when-idle", "2.5", "--clock-rate",
        "100000"},
       true},
      {{"--no-session-bus", "--version"}, true},
      {{"-h"}, true},
      {{"--log-level", "fault"}, false},
      {{"--clock-rate", "0.5"}, false},
      {{"--clock-rate", "100001"}, false},
      {{"--clock-rate", "1e3"}, false},
      {{"--clock-rate", "nan"}, false},
      {{"--exit-when-idle", "inf"}, false},
      {{"--exit-when-idle", "-1"}, false},
      {{"--exit-when-idle"}, false},
      {{"--log-file", ""}, false},
      {{"--log-file=", "--no-session-bus"}, false},
      {{"--no-session-bus=false"}, false},
      {{"--unknown"}, false},
      {{"word"}, false},
  };
  for (const auto& [arguments, valid] : cases) {
    SCOPED_TRACE(testing::PrintToString(arguments));
    EXPECT_EQ(std::holds_alternative<CommandLine>(parseCommandLine(arguments)), valid);
  }
  const auto line =
      std::get<CommandLine>(parseCommandLine({"--exit-when-idle", "2.5", "--log-level", "error"}));
  EXPECT_EQ(line.exitWhenIdle, 2500ms);
  EXPECT_EQ(line.logLevel, LogLevel::Error);
}

TEST(DiagnosticsTest, ReadsAndWritesSettingsAndTellsTheStatus) {
  DaemonBed bed;
  bed.installBag(kServedBag);
  const auto client = bed.connectAndConfigure();
  const auto ask = [&](const std::string& member, ipc::Values values) {
    auto answer = client->call(std::string(kDiagnosticsInterface), member, std::move(values));
    bed.run();
    return answer;
  };
  EXPECT_TRUE(ask("WriteDefault", {"", "ZLKNoParallax", "true"})->succeeded());
  EXPECT_EQ(
      *ask("ReadDefault", {"com.quenta.zelkord", "ZLKNoParallax"})->values[0].get<std::string>(),
      "true");
  EXPECT_TRUE(ask("WriteDefault", {"", "ZLKNoParallax", ""})->succeeded());
  EXPECT_EQ(*ask("ReadDefault", {"", "ZLKNoParallax"})->values[0].get<std::string>(), "");
  EXPECT_EQ(ask("WriteDefault", {"", "key", "{"})->errorName, ipc::kInvalidArgs);
  for (const char* own : {"", "com.quenta.zelkord"}) {
    for (const char* value : {"true", ""}) {
      const auto refused = ask("WriteDefault", {own, "ZLKNoParalax", value});
      EXPECT_EQ(refused->errorName, ipc::kInvalidArgs) << own << value;
    }
    EXPECT_EQ(ask("WriteDefault", {own, "ZLKNoParallax", "\"yes\""})->errorName, ipc::kInvalidArgs);
  }
  EXPECT_EQ(*ask("ReadDefault", {"", "ZLKNoParallax"})->values[0].get<std::string>(), "");
  EXPECT_TRUE(ask("WriteDefault", {"com.example", "any", "\"yes\""})->succeeded());
  EXPECT_EQ(ask("Metrics", {})->values[0].get<ipc::IntegerMap>()->at("com.quenta.zelkord.launch"),
            1);
  const auto status = parseJson(*ask("Status", {})->values[0].get<std::string>())->as_object();
  EXPECT_EQ(status.at("connections").as_array().size(), 1u);
  EXPECT_EQ(status.at("bag").at("version"), "4");
  EXPECT_EQ(status.at("bag").at("url"), "https://api.zelkor.example/bag");
  EXPECT_TRUE(status.at("bag").at("last_failure").is_null());
  EXPECT_EQ(status.at("transactions").as_array(), (json::array{"bagFetch", "clientConnection"}));
}

TEST(DiagnosticsTest, SayWhyThereIsNoBagAndWhenTheNextIsFetched) {
  DaemonBed bed;
  const auto client = bed.connectAndConfigure();
  const auto failedAt = secondsSince1970(bed.fakes.timeline.wallNow());
  bed.fakes.urlSessions.find("bagSession")
      ->pending()
      .at(0)
      ->fail(urlError(URLErrorCode::CannotConnect, "Connection refused"));
  bed.run();
  bed.fakes.timeline.advance(5s);
  const auto answer = client->call(std::string(kDiagnosticsInterface), "Status", {});
  bed.run();
  const auto bag = parseJson(*answer->values[0].get<std::string>())->at("bag").as_object();
  EXPECT_EQ(bag,
            (json::object{{"url", "https://api.zelkor.example/bag"},
                          {"last_failure", {{"time", failedAt}, {"reason", "connection refused"}}},
                          {"next_attempt", failedAt + 5}}));
}

}  // namespace
}  // namespace zelkord
