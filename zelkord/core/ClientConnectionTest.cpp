#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>

#include "corezelkor/Constants.h"
#include "zelkord/core/ClientConnection.h"
#include "zelkord/core/ClientStateManager.h"
#include "zelkord/core/DaemonTestSupport.h"

namespace zelkord {
namespace {

class ClientConnectionTest : public testing::Test {
 protected:
  std::string address(const DaemonBed::Answer& answer) {
    return *answer->values.at(0).get<std::string>();
  }
  void answerTask(std::size_t index, const std::string& body = "[]") {
    bed_.urlSession().tasks().at(index)->succeed(200, body);
    bed_.run();
  }

  DaemonBed bed_;
};

TEST_F(ClientConnectionTest, ConfigureAnswersBeforeTheBagDoes) {
  const auto client = bed_.connect();
  const auto answer =
      client->call(std::string(kDaemonInterface), "Configure",
                   {ipc::Dictionary{{"identifier", "lanthe"}, {"userAgent", "Lanthe/9"}}});
  ASSERT_TRUE(bed_.fakes.timeline.runUntil([&] { return answer->answered; }, 100ms));
  EXPECT_EQ(address(answer), bed_.daemon.assembly().clientStateManager()->endpoint());
  EXPECT_TRUE(client->callbacks().empty());
  bed_.fakes.timeline.advance(1s);
  ASSERT_EQ(client->callbacks().size(), 1u);
  EXPECT_EQ(client->callbacks()[0].member, "BagDidLoad");
  EXPECT_TRUE(client->callbacks()[0].values[0].get<ipc::Dictionary>()->empty());
  EXPECT_FALSE(client->callbacks()[0].values[1].get<ipc::Dictionary>()->empty());
}

TEST_F(ClientConnectionTest, ConfigureGoesAheadOfWhatWaitsForABagAndNothingElseDoes) {
  const auto client = bed_.connectAndConfigure();
  bed_.fakes.timeline.advance(2s);  // the bag that was to be told
  const auto call = [&](const std::string& member, ipc::Values values) {
    return client->call(std::string(kDaemonInterface), member, std::move(values));
  };
  const auto search = [&](std::int64_t queryId) {
    return call("Request", {"search", ipc::Dictionary{{"queryId", queryId}, {"queryString", "s"}}});
  };
  auto& timeline = bed_.fakes.timeline;
  const auto begin = timeline.now();
  const auto bag = call("Bag", {});
  const auto first = search(1);
  const auto second = search(2);
  const auto sessions = call("ListSessions", {});
  const auto configure =
      call("Configure", {ipc::Dictionary{{"identifier", "lanthe"}, {"userAgent", "Lanthe/10"}}});
  ASSERT_TRUE(timeline.runUntil([&] { return configure->answered; }, 100ms));
  EXPECT_EQ(timeline.now(), begin);
  EXPECT_FALSE(bag->answered);
  std::vector<std::string> order;
  while (order.size() < 4 && timeline.now() - begin < 10s) {
    timeline.advance(1ms);
    const std::pair<const char*, DaemonBed::Answer> all[] = {
        {"bag", bag}, {"first", first}, {"second", second}, {"sessions", sessions}};
    for (const auto& [name, answer] : all) {
      if (answer->answered && std::ranges::find(order, name) == order.end()) order.push_back(name);
    }
  }
  EXPECT_THAT(order, testing::ElementsAre("bag", "first", "second", "sessions"));
  // Nothing waits any more: calls are handled as they come.
  EXPECT_TRUE(bed_.call(client, "ListSessions")->answered);
}

TEST_F(ClientConnectionTest, WhatWaitsIsDroppedWhenTheClientGoes) {
  const auto client = bed_.connectAndConfigure();
  bed_.fakes.timeline.advance(2s);
  for (std::int64_t queryId = 1; queryId <= 20; ++queryId) {
    client->call(std::string(kDaemonInterface), "Request",
                 {"search", ipc::Dictionary{{"queryId", queryId}, {"queryString", "s"}}});
  }
  const auto departure = bed_.fakes.timeline.global(QualityOfService::Default).after(100ms, [&] {
    client->disconnect();
  });
  bed_.fakes.timeline.advance(2s);
  EXPECT_EQ(bed_.fakes.counters.all()["com.quenta.zelkord.lanthe.keystrokes"], 1);
  EXPECT_THAT(bed_.fakes.transactions.openNames(),
              testing::Not(testing::Contains("clientConnection")));
}

TEST_F(ClientConnectionTest, TellsEachBagOnceHoweverOftenItIsConfigured) {
  bed_.installBag(kServedBag);
  const auto client = bed_.connectAndConfigure();
  bed_.configure(client);
  client->takeCallbacks();
  bed_.installBag(R"({"version":"5"})");
  ASSERT_EQ(client->callbacks().size(), 1u);
  const auto& bag = *client->callbacks()[0].values[0].get<ipc::Dictionary>();
  EXPECT_EQ(*bag.at("version").get<std::string>(), "5");
  EXPECT_EQ(*bag.at("enabled").get<bool>(), true);
}

TEST_F(ClientConnectionTest, AnInvalidFirstConfigurationClosesTheConnection) {
  const std::vector<std::pair<std::string, std::string>> cases = {{"", "Lanthe/9"}, {"lanthe", ""}};
  for (const auto& [identifier, agent] : cases) {
    SCOPED_TRACE(identifier);
    const auto client = bed_.connect();
    EXPECT_FALSE(bed_.configure(client, identifier, agent)->answered);
    EXPECT_EQ(client->state(), ipc::FakeClient::State::Ended);
  }
  EXPECT_TRUE(bed_.fakes.log.contains("invalid configuration, closing connection"));
}

TEST_F(ClientConnectionTest, AnInvalidLaterConfigurationIsAnsweredAndKeepsTheState) {
  const auto client = bed_.connectAndConfigure();
  EXPECT_TRUE(bed_.configure(client, "", "")->answered);
  EXPECT_TRUE(bed_.configure(client, "brelin", "Brelin/1")->answered);
  EXPECT_TRUE(bed_.fakes.log.contains("session identifier must match"));
  EXPECT_EQ(client->state(), ipc::FakeClient::State::Open);
}

TEST_F(ClientConnectionTest, RefusesWhatAProcessConfiguresBeyondItsShare) {
  const std::string longest(65'536, 'x');
  const struct {
    const char* counter;
    std::size_t states;
    std::string suffix;
  } cases[] = {{"client_states", 1024, ""}, {"client_state_bytes", 62, longest.substr(7)}};
  for (const auto& [counter, states, suffix] : cases) {
    SCOPED_TRACE(counter);
    DaemonBed bed;
    const auto agent = suffix.empty() ? "A/1" : longest;
    for (std::size_t i = 0; i < states; ++i) {
      const auto client = bed.connect(1);
      ASSERT_TRUE(bed.configure(client, std::to_string(1000 + i) + suffix, agent)->succeeded());
      client->disconnect();
      bed.run();
    }
    const auto client = bed.connect(1);
    EXPECT_EQ(bed.configure(client, "further" + suffix, agent)->errorName, ipc::kLimitsExceeded);
    EXPECT_EQ(bed.fakes.counters.all()[std::string("com.quenta.zelkord.limit.") + counter], 1);
    EXPECT_FALSE(bed.daemon.assembly().clientStateManager()->configuredState("further" + suffix));
    // The connection goes on; known clients and other processes, too.
    EXPECT_TRUE(bed.configure(client, "1000" + suffix, agent)->succeeded());
    EXPECT_TRUE(bed.configure(bed.connect(2), "further" + suffix, agent)->succeeded());
    EXPECT_EQ(bed.daemon.assembly().clientStateManager()->states().size(), states + 1);
  }
}

TEST_F(ClientConnectionTest, AUserAgentThatGrowsCountsForWhoConfiguresIt) {
  const std::string longest(65'536, 'x');
  std::size_t fit = 0;
  for (int i = 0; i < 200; ++i) {
    const auto client = bed_.connectAndConfigure("client " + std::to_string(i), 1);
    if (bed_.configure(client, "client " + std::to_string(i), longest)->succeeded()) ++fit;
    client->disconnect();
    bed_.run();
  }
  EXPECT_GT(fit, 50u);
  EXPECT_LT(fit, 128u);
  EXPECT_TRUE(bed_.configure(bed_.connect(2), "client 199", longest)->succeeded());
}

TEST_F(ClientConnectionTest, AnswersOnlyTheNewestSearch) {
  bed_.installBag(kServedBag);
  const auto client = bed_.connectAndConfigure();
  const auto five = bed_.search(client, 5);
  const auto three = bed_.search(client, 3);
  ASSERT_TRUE(three->answered);
  EXPECT_EQ(*three->values[0].get<std::int64_t>(), 3);
  EXPECT_TRUE(isNothing(*three, 1) && isNothing(*three, 2));
  const auto six = bed_.search(client, 6);
  answerTask(0);
  ASSERT_TRUE(five->answered);
  EXPECT_TRUE(isNothing(*five, 1) && isNothing(*five, 2));
  answerTask(1);
  ASSERT_TRUE(six->answered);
  const auto& reply = *six->values[1].get<ipc::Dictionary>();
  EXPECT_EQ(reply.at("data").get<Data>()->view(), "[]");
  EXPECT_EQ(*reply.at("scale").get<double>(), bed_.fakes.textInput.mainScreenScale());
}

TEST_F(ClientConnectionTest, AnUnboundConnectionGetsNoAnswersButForStaleSearches) {
  bed_.installBag(kServedBag);
  const auto client = bed_.connect();
  EXPECT_FALSE(bed_.call(client, "Bag")->answered);
  EXPECT_FALSE(bed_.search(client, 1)->answered);
  EXPECT_TRUE(bed_.search(client, 0)->answered);
  EXPECT_TRUE(bed_.search(client, 1)->answered);
  for (const auto* kind :
       {"moreResults", "card", "zeroKeyword", "lookup", "flightLookup", "flightSearch"}) {
    EXPECT_FALSE(bed_.call(client, "Request", {kind, ipc::Dictionary{}})->answered) << kind;
  }
  EXPECT_TRUE(bed_.urlSession().tasks().empty());
  EXPECT_TRUE(bed_.call(client, "ListSessions")->answered);
  EXPECT_TRUE(bed_.fakes.log.contains("configuration must not be nil"));
}

// Searches go stale, see above; nothing else does.
TEST_F(ClientConnectionTest, ServesEveryKindWhateverItsNumber) {
  struct Case {
    const char* kind;
    bool isSent;
    std::vector<std::uint32_t> trace;
  };
  const std::vector<Case> cases = {
      {"moreResults", true, {}},
      {"card", true, {0x2B00000C, 0x2B000010}},
      {"zeroKeyword", true, {0x2B00001C, 0x2B000020}},
      {"lookup", true, {0x2B00002C, 0x2B000030}},
      {"flightLookup", false, {}},
      {"flightSearch", false, {}},
  };
  DaemonBed bed({{"TraceEnabled", true}});
  bed.installBag(kServedBag);
  bed.fakes.textInput.scale = 3;
  const auto client = bed.connectAndConfigure();
  bed.search(client, 50);
  bed.fakes.trace.take();
  for (const auto& [kind, isSent, trace] : cases) {
    for (const auto queryId : {std::int64_t{-3}, std::int64_t{3}, std::int64_t{90}}) {
      SCOPED_TRACE(std::string(kind) + std::to_string(queryId));
      const auto answer = bed.call(client, "Request",
                                   {kind, ipc::Dictionary{{"queryId", queryId},
                                                          {"moreResultsURL", "https://m.example"},
                                                          {"cardURL", "https://c.example"}}});
      EXPECT_EQ(answer->answered, !isSent);
      if (isSent) bed.urlSession().pending().back()->succeed(200, "[]");
      bed.run();
      ASSERT_TRUE(answer->answered);
      EXPECT_EQ(*answer->values[0].get<std::int64_t>(), queryId);
      EXPECT_TRUE(isNothing(*answer, 2));
      const auto& reply = *answer->values[1].get<ipc::Dictionary>();
      ASSERT_EQ(reply.empty(), !isSent);
      if (isSent) {
        EXPECT_EQ(*reply.at("scale").get<double>(), 3);
      }
      EXPECT_EQ(bed.fakes.trace.take(), trace);
    }
  }
  EXPECT_FALSE(bed.search(client, 51)->answered);  // the others' numbers have not made it stale
}

TEST_F(ClientConnectionTest, RefusesWhatItCannotMean) {
  struct Case {
    const char* name;
    ipc::Dictionary request;
    std::string_view error;
  };
  const std::vector<Case> cases = {
      {"a text as number", {{"queryId", "1"}}, ipc::kInvalidArgs},
      {"trigger event 20", {{"triggerEvent", std::uint32_t{20}}}, ipc::kInvalidArgs},
      {"negative scale", {{"scale", -1.0}}, ipc::kInvalidArgs},
      {"scale not a number", {{"scale", std::nan("")}}, ipc::kInvalidArgs},
      {"control character", {{"queryItems", ipc::StringPairs{{"a", "b\n"}}}}, ipc::kInvalidArgs},
      {"C1 control character",
       {{"queryItems", ipc::StringPairs{{"\xC2\x85", ""}}}},
       ipc::kInvalidArgs},
      {"257 items", {{"queryItems", ipc::StringPairs(257)}}, ipc::kLimitsExceeded},
      {"nothing wrong", {{"queryId", std::int64_t{0}}, {"unknown", ipc::Unsupported{"(xx)"}}}, ""},
  };
  const auto client = bed_.connectAndConfigure();
  for (const auto& wanted : cases) {
    SCOPED_TRACE(wanted.name);
    bed_.fakes.log.clear();
    const auto answer = bed_.call(client, "Request", {"search", wanted.request});
    EXPECT_TRUE(answer->answered);
    EXPECT_EQ(answer->errorName, wanted.error);
    EXPECT_EQ(bed_.fakes.log.count(LogLevel::Error), wanted.error.empty() ? 0 : 1);
  }
  EXPECT_EQ(bed_.call(client, "Configure", {ipc::Dictionary{{"identifier", "a\x01"}}})->errorName,
            ipc::kInvalidArgs);
}

TEST_F(ClientConnectionTest, DropsKindsThatDoNotExist) {
  const auto client = bed_.connectAndConfigure();
  EXPECT_FALSE(bed_.call(client, "Request", {"nonsense", ipc::Dictionary{}})->answered);
  EXPECT_EQ(client->state(), ipc::FakeClient::State::Open);
}

TEST_F(ClientConnectionTest, EndsAfterThreeSilentMinutesButNotWhileACallWaits) {
  bed_.installBag(kServedBag);
  const auto silent = bed_.connectAndConfigure("brelin", 1);
  const auto waiting = bed_.connectAndConfigure("lanthe", 2);
  bed_.search(waiting, 1);
  bed_.fakes.timeline.advance(179s);
  EXPECT_EQ(silent->state(), ipc::FakeClient::State::Open);
  bed_.fakes.timeline.advance(61s);
  EXPECT_EQ(silent->state(), ipc::FakeClient::State::Ended);
  bed_.fakes.timeline.advance(600s);
  EXPECT_EQ(waiting->state(), ipc::FakeClient::State::Open);
  answerTask(0);
  bed_.fakes.timeline.advance(179s);
  EXPECT_EQ(waiting->state(), ipc::FakeClient::State::Open);
  bed_.fakes.timeline.advance(61s);
  EXPECT_EQ(waiting->state(), ipc::FakeClient::State::Ended);
  EXPECT_TRUE(bed_.fakes.log.contains("timing out idle xpc connection"));
}

TEST_F(ClientConnectionTest, EveryMessageBeginsTheSilenceAnew) {
  const auto client = bed_.connectAndConfigure();
  auto& manager = *bed_.daemon.assembly().clientStateManager();
  const auto endpoint = bed_.fakes.interprocess.connect(manager.endpoint());
  bed_.run();
  const std::pair<const char*, ipc::Values> cases[] = {
      {"ListSessions", {}}, {"NoSuchMember", {}}, {"Request", {"of the wrong type"}}};
  for (const auto& [member, arguments] : cases) {
    SCOPED_TRACE(member);
    bed_.fakes.timeline.advance(170s);
    bed_.call(client, member, arguments);
    endpoint->call(std::string(kEndpointInterface), member, arguments);
    EXPECT_EQ(client->state(), ipc::FakeClient::State::Open);
    EXPECT_EQ(endpoint->state(), ipc::FakeClient::State::Open);
  }
}

TEST_F(ClientConnectionTest, FillsInWhatTheClientLeftOut) {
  bed_.installBag(kServedBag);
  bed_.fakes.textInput.inputMode = "de_DE@keyboard";
  bed_.fakes.textInput.scale = 3;
  const auto client = bed_.connectAndConfigure();
  bed_.search(client, 1);
  bed_.search(client, 2, "snow", {{"keyboardInputMode", "fr"}, {"scale", 2.0}});
  const auto tasks = bed_.urlSession().tasks();
  EXPECT_THAT(tasks[0]->request().url, testing::HasSubstr("kb_ime=de_DE@keyboard"));
  EXPECT_EQ(tasks[0]->request().header("X-Quenta-UI-Scale"), "3.0");
  EXPECT_THAT(tasks[1]->request().url, testing::HasSubstr("kb_ime=fr"));
  EXPECT_EQ(tasks[1]->request().header("X-Quenta-UI-Scale"), "2.0");
}

}  // namespace
}  // namespace zelkord
