#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "halvane/ModelFeedback.h"
#include "zelkord/assembly/ClientShortName.h"
#include "zelkord/assembly/NotificationNames.h"
#include "zelkord/feedback/UserGUIDSource.h"
#include "zelkord/query/ClientState.h"
#include "zelkord/query/QueryCache.h"
#include "zelkord/query/QueryTestSupport.h"

namespace zelkord {
namespace {

TEST(ClientShortNameTest, IsTheFirstKnownNameInTheIdentifier) {
  const std::vector<std::pair<std::string, std::optional<std::string>>> cases = {
      {"lanthe", "lanthe"},       {"com.quenta.BRELIN", "brelin"}, {"news-brelin", "brelin"},
      {"zelkordtool", "zelkord"}, {"other", std::nullopt},         {"", std::nullopt}};
  for (const auto& [identifier, expected] : cases)
    EXPECT_EQ(clientShortName(identifier), expected) << identifier;
}

class ClientStateTest : public testing::Test {
 protected:
  struct BagAnswer {
    int count = 0;
    std::shared_ptr<const ZLKBag> bag;
    std::optional<Error> error;
  };
  BagAnswer askForBag(ClientState& state, const std::optional<std::string>& userAgent) {
    BagAnswer answer;
    state.bag(userAgent, [&](auto bag, auto error) { answer = {answer.count + 1, bag, error}; });
    return answer;
  }

  QueryBed bed_;
};

TEST_F(ClientStateTest, SeesTheBagWithItsOwnUserAgent) {
  bed_.installBag(R"({"enabled":true,"agents":{"brelin":{"enabled":false}}})");
  const auto state = bed_.makeState("brelin", "Brelin/2");
  EXPECT_FALSE(askForBag(*state, "Brelin/2").bag->isEnabled());
  EXPECT_TRUE(askForBag(*state, "Other/1").bag->isEnabled());
  EXPECT_EQ(state->userAgent(), "Other/1");
}

TEST_F(ClientStateTest, WaitsASecondForABagAndIsWokenByOne) {
  const auto state = bed_.makeState();
  const auto begin = bed_.fakes.timeline.now();
  EXPECT_EQ(askForBag(*state, std::nullopt).error, zelkorError(1, "timeout"));
  EXPECT_EQ(bed_.fakes.timeline.now() - begin, 1s);

  const auto arrival = bed_.fakes.timeline.global(QualityOfService::Default).after(300ms, [&] {
    bed_.assembly.bagController()->cacheBagState(
        std::make_shared<const ZLKBag>(std::make_shared<const json::object>(), "daemon"),
        BagOrigin::Network);
  });
  const auto second = bed_.fakes.timeline.now();
  EXPECT_TRUE(askForBag(*state, std::nullopt).bag);
  EXPECT_EQ(bed_.fakes.timeline.now() - second, 300ms);
}

TEST_F(ClientStateTest, AProcessWaitsForBagsOnlyInItsShare) {
  auto& limits = bed_.assembly.limits();
  const auto budgets = std::make_shared<ClientBudgets>(
      ClientBudgets{Budget("query_cache_bytes", {}, limits),
                    Budget("bag_waits", {.inAll = 4, .ofOneHolder = 1}, limits)});
  const auto state = std::make_shared<ClientState>("lanthe", bed_.assembly, budgets);
  const auto others = budgets->bagWaits.take(processHolder(7));
  for (const auto& [process, expected] : {std::pair(7, 0s), {8, 1s}, {8, 1s}}) {
    state->setProcess(process);
    const auto begin = bed_.fakes.timeline.now();
    EXPECT_EQ(askForBag(*state, "Lanthe/1").error, zelkorError(1, "timeout"));
    EXPECT_EQ(bed_.fakes.timeline.now() - begin, expected) << process;
  }
  EXPECT_EQ(bed_.fakes.counters.all()["com.quenta.zelkord.limit.bag_waits"], 1);
}

TEST_F(ClientStateTest, AFetchThatFailsEndsTheWait) {
  const auto state = bed_.makeState();
  const auto failure = bed_.fakes.timeline.global(QualityOfService::Default).after(200ms, [&] {
    bed_.fakes.urlSessions.find("bagSession")->tasks().back()->succeed(500, "");
  });
  const auto begin = bed_.fakes.timeline.now();
  EXPECT_EQ(askForBag(*state, std::nullopt).error, zelkorError(1, "timeout"));
  EXPECT_EQ(bed_.fakes.timeline.now() - begin, 200ms);
}

TEST_F(ClientStateTest, AChangeWakesAllWhoWaitAndNoOneLater) {
  const auto state = bed_.makeState();
  auto& timeline = bed_.fakes.timeline;
  std::vector<Duration> waited;
  const auto begin = timeline.now();
  for (int i = 0; i < 3; ++i) {
    timeline.global(QualityOfService::Default).async([&] {
      EXPECT_EQ(askForBag(*state, std::nullopt).error, zelkorError(1, "timeout"));
      waited.push_back(timeline.now() - begin);
    });
  }
  const auto change = timeline.global(QualityOfService::Default).after(300ms, [&] {
    bed_.fakes.notificationCenter.post(std::string(kZLKBagChangeNotification));
  });
  timeline.advance(2s);
  EXPECT_THAT(waited, testing::ElementsAre(300ms, 300ms, 300ms));
  const auto later = timeline.now();
  askForBag(*state, std::nullopt);
  EXPECT_EQ(timeline.now() - later, 1s);
}

TEST_F(ClientStateTest, ChangesThatNobodyWaitedForEndLaterWaitsAtOnce) {
  const auto state = bed_.makeState();
  auto& timeline = bed_.fakes.timeline;
  askForBag(*state, std::nullopt);  // observes from now on
  for (int i = 0; i < 2; ++i) {
    bed_.fakes.notificationCenter.post(std::string(kZLKBagChangeNotification));
  }
  std::vector<Duration> waited;
  for (int i = 0; i < 3; ++i) {
    const auto begin = timeline.now();
    EXPECT_EQ(askForBag(*state, std::nullopt).error, zelkorError(1, "timeout"));
    waited.push_back(timeline.now() - begin);
  }
  EXPECT_THAT(waited, testing::ElementsAre(0s, 0s, 1s));
}

TEST_F(ClientStateTest, WithoutAUserAgentThereIsNoBag) {
  bed_.installBag(kTestBag);
  const auto state = std::make_shared<ClientState>("lanthe", bed_.assembly);
  EXPECT_EQ(askForBag(*state, std::nullopt).error, zelkorError(1, "no UserAgent"));
  EXPECT_EQ(askForBag(*state, "").error, zelkorError(1, "no UserAgent"));
}

TEST_F(ClientStateTest, ANewUserAgentEmptiesTheCache) {
  bed_.installBag(kTestBag);
  const auto state = bed_.makeState();
  bed_.search(*state, "s");
  bed_.urlSession().tasks().back()->succeed(200, R"([{"query":"snow"}])");
  bed_.fakes.timeline.runUntilIdle();
  ASSERT_EQ(state->queryCache()->count(), 1u);
  state->adoptUserAgent("Lanthe/9");
  bed_.fakes.timeline.runUntilIdle();
  EXPECT_EQ(state->queryCache()->count(), 1u);
  state->adoptUserAgent("Lanthe/10");
  bed_.fakes.timeline.runUntilIdle();
  EXPECT_EQ(state->queryCache()->count(), 0u);
}

TEST_F(ClientStateTest, WarmsOnceInThirtySeconds) {
  const auto state = bed_.makeState();
  state->warm();  // no bag yet
  EXPECT_TRUE(bed_.urlSession().tasks().empty());
  bed_.installBag(kTestBag);
  state->warm();
  bed_.fakes.timeline.advance(29s);
  state->warm();
  EXPECT_EQ(bed_.urlSession().tasks().size(), 1u);
  bed_.fakes.timeline.advance(1s);
  state->warm();
  ASSERT_EQ(bed_.urlSession().tasks().size(), 2u);
  EXPECT_EQ(bed_.urlSession().tasks()[0]->request().url, "https://search.example/w");
  bed_.urlSession().tasks()[0]->succeed(204);
  bed_.fakes.timeline.runUntilIdle();
  const auto records = bed_.records();
  const auto& start = dynamic_cast<const HVStartNetworkSearchFeedback&>(*records.at(0).feedback);
  EXPECT_EQ(start.triggerEvent.value, 19);
  EXPECT_EQ(start.endpointType.value, 12);
  EXPECT_EQ(start.input, "");
  EXPECT_EQ(start.url, "https://search.example/w");
  const auto& end = dynamic_cast<const HVEndNetworkSearchFeedback&>(*records.back().feedback);
  EXPECT_EQ(end.uuid, start.uuid);
  EXPECT_EQ(end.statusCode, 204);
  for (const auto& record : records) {
    EXPECT_EQ(record.queryId, 0);
    EXPECT_FALSE(record.userGuid);
    EXPECT_THAT(*record.userAgent, testing::StartsWith("Zelkord/1.0 ("));
  }
}

TEST_F(ClientStateTest, MessagesAskForRequestsWithoutLocation) {
  for (const auto& [agent, mask] : std::vector<std::pair<std::string, FieldMask>>{
           {"Lanthe/9", kFieldMaskNone}, {"com.quenta.MESSAGES/2", kFieldMaskWithholdLocation}}) {
    EXPECT_EQ(bed_.makeState("x", agent)->fieldMask(), mask) << agent;
  }
}

TEST_F(ClientStateTest, IndividualSessionsHaveTheirOwnIdentifier) {
  const auto shared = bed_.makeState();
  EXPECT_EQ(&shared->guidController(), bed_.assembly.guidController());
  bed_.assembly.setSharedSession(false);
  const auto own = bed_.makeState("brelin");
  EXPECT_NE(own->guidController().currentUserGUID(), shared->guidController().currentUserGUID());
  EXPECT_EQ(own->sessionManager().identifier(), "brelin");
}

TEST_F(ClientStateTest, TheCacheCanBeSwitchedOff) {
  bed_.fakes.settings.set("ZLKNoQueryCache", true);
  bed_.installBag(kTestBag);
  const auto state = bed_.makeState();
  EXPECT_EQ(state->queryCache(), nullptr);
  EXPECT_TRUE(bed_.fakes.log.contains("query cache OFF for lanthe"));
  bed_.search(*state, "s");
  bed_.urlSession().tasks().back()->succeed(200, R"([{"query":"snow"}])");
  bed_.fakes.timeline.runUntilIdle();
  EXPECT_EQ(bed_.search(*state, "sn")->count, 0);
}

}  // namespace
}  // namespace zelkord
