#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "halvane/DaemonFeedback.h"
#include "zelkord/assembly/NotificationNames.h"
#include "zelkord/feedback/UserGUIDSource.h"
#include "zelkord/query/QueryCache.h"
#include "zelkord/query/QueryTestSupport.h"
#include "zelkord/query/SearchFlow.h"

namespace zelkord {
namespace {

using testing::ElementsAre;

constexpr const char* kOneResultSet =
    R"([{"status":"OK","query":"snowman","completion_score":0.5,"fbq":"f","partial_client_ip":"10.0","duration":12.5,"results":[]}])";

class SearchFlowTest : public testing::Test {
 protected:
  FakeURLTask& lastTask() { return *bed_.urlSession().tasks().back(); }
  void answer(int status, const std::string& body, HTTPHeaders headers = {}) {
    lastTask().succeed(status, body, std::move(headers));
    bed_.fakes.timeline.runUntilIdle();
  }

  QueryBed bed_;
};

TEST_F(SearchFlowTest, TellsThatATextWasTooShort) {
  bed_.installBag(R"({"search_url":"https://s.example/","minimum_query_length":5})");
  const auto answered = bed_.search(*bed_.makeState(), "snow", 3);
  EXPECT_EQ(answered->count, 1);
  EXPECT_EQ(answered->queryId, 3);
  EXPECT_FALSE(answered->reply || answered->error);
  const auto records = bed_.records();
  ASSERT_EQ(records.size(), 1u);
  const auto& skip = dynamic_cast<const ZLKSkipSearchFeedback&>(*records[0].feedback);
  EXPECT_EQ(skip.triggerEvent.value, 1);
  EXPECT_EQ(skip.input, "snow");
  EXPECT_TRUE(records[0].userGuid);
  EXPECT_TRUE(bed_.fakes.log.contains("query[3] input '<private>' less than minQueryLength"));
}

TEST_F(SearchFlowTest, CountsTheLengthOfAQueryInUtf16Units) {
  bed_.installBag(R"({"search_url":"https://s.example/","minimum_query_length":2})");
  const auto state = bed_.makeState();
  EXPECT_EQ(bed_.search(*state, "\xC3\xA9")->count, 1);          // one unit: too short
  EXPECT_EQ(bed_.search(*state, "\xF0\x9F\x98\x80")->count, 0);  // a surrogate pair: sent
}

TEST_F(SearchFlowTest, AnswersALaterKeystrokeFromTheCache) {
  bed_.installBag(kTestBag);
  const auto state = bed_.makeState();
  ZLKSearchRequest fetched;
  fetched.queryString = "sno";
  fetched.scale = 2;
  fetched.uuid = "uuid of sno";
  bed_.search(*state, fetched);
  answer(200, kOneResultSet);
  bed_.fakes.maps.session = "maps-session";

  ZLKSearchRequest later;
  later.queryId = 2;
  later.clientQueryId = 20;
  later.queryString = "SNOWM";
  later.scale = 2;
  later.uuid = "another";
  const auto cached = bed_.search(*state, later);
  EXPECT_EQ(cached->count, 1);
  ASSERT_TRUE(cached->reply);
  EXPECT_EQ(cached->queryId, 2);
  EXPECT_EQ(cached->reply->data.view(), kOneResultSet);
  EXPECT_EQ(cached->reply->scale, 2);
  EXPECT_EQ(cached->reply->geoSessionEntityString, "maps-session");
  EXPECT_EQ(bed_.urlSession().tasks().size(), 1u);
  const auto record = bed_.records().back();
  const auto& hit = dynamic_cast<const ZLKCacheHitFeedback&>(*record.feedback);
  EXPECT_EQ(hit.triggerEvent.value, 4);
  EXPECT_EQ(hit.input, "SNOWM");
  EXPECT_EQ(hit.uuid, "uuid of sno");
  EXPECT_EQ(record.queryId, 2);
  EXPECT_EQ(record.clientQueryId, 20u);
  EXPECT_EQ(bed_.counter("com.quenta.zelkord.lanthe.keystrokes"), 2);
  EXPECT_EQ(bed_.counter("com.quenta.zelkord.lanthe.ondevicecachehits"), 1);

  ZLKSearchRequest withItems;
  withItems.queryString = "snowm";
  withItems.queryItems = {{"a", "b"}};
  EXPECT_EQ(bed_.search(*state, withItems)->count, 0);
  EXPECT_EQ(bed_.urlSession().tasks().size(), 2u);
}

TEST_F(SearchFlowTest, AnAnswerIsNotUsedUnderAnotherUserIdentifier) {
  bed_.installBag(kTestBag);
  const auto state = bed_.makeState();
  bed_.search(*state, "s");
  answer(200, kOneResultSet);
  EXPECT_EQ(bed_.search(*state, "sn")->count, 1);
  bed_.fakes.timeline.advance(900s);
  EXPECT_EQ(bed_.search(*state, "sno")->count, 0) << "the search is what ends the identifier";
  EXPECT_EQ(bed_.urlSession().tasks().size(), 2u);
  state->guidController().reset();
  bed_.fakes.timeline.runUntilIdle();
  answer(200, kOneResultSet);
  EXPECT_EQ(state->queryCache()->count(), 0u) << "it was asked for under the old one";
  EXPECT_EQ(bed_.search(*state, "snow")->count, 0);
}

TEST_F(SearchFlowTest, CachesEveryEntryButThoseInError) {
  bed_.installBag(kTestBag);
  const auto state = bed_.makeState();
  bed_.search(*state, "s");
  answer(
      200,
      R"([{"status":"ERROR","query":"sad"},{"query":"snow"},{"status":"OK","query":"sun"},7,{"query":5}])");
  EXPECT_EQ(state->queryCache()->count(), 2u);
}

TEST_F(SearchFlowTest, CachesLongListsWhole) {
  bed_.installBag(kTestBag);
  const auto state = bed_.makeState();
  bed_.search(*state, "s");
  std::string list = "[";
  for (int i = 100; i < 400; ++i) list += R"({"query":"s)" + std::to_string(i) + R"("},)";
  answer(200, list + "{}]");
  EXPECT_EQ(state->queryCache()->count(), 300u);
}

TEST_F(SearchFlowTest, FetchesTheBagThatAResponseNames) {
  const std::vector<std::pair<std::string, bool>> cases = {{R"({"bag": 12})", true},
                                                           {R"({"bag": 1})", false},
                                                           {"[1]", false},
                                                           {"{", false},
                                                           {"\xFF", false}};
  for (const auto& [header, fetches] : cases) {
    SCOPED_TRACE(header);
    QueryBed bed;
    bed.installBag(kTestBag);
    bed.search(*bed.makeState(), "snow");
    bed.urlSession().tasks().back()->succeed(200, "[]", {{"x-quenta-forcefetch", header}});
    bed.fakes.timeline.runUntilIdle();
    const auto session = bed.fakes.urlSessions.find("bagSession");
    EXPECT_EQ(session && !session->tasks().empty(), fetches);
    const bool isDictionary = header.front() == '{' && header.size() > 1;
    EXPECT_EQ(
        bed.fakes.log.contains("X-Quenta-ForceFetch header data into a dictionary: <private>"),
        !isDictionary);
  }
}

TEST_F(SearchFlowTest, ShowsTheExchangeToAClientThatAsks) {
  bed_.installBag(kTestBag);
  const auto state = bed_.makeState();
  ZLKSearchRequest request;
  request.queryString = "snow";
  request.verboseReply = true;
  const auto answered = bed_.search(*state, request);
  answer(200, "[]", {{"Server", "a"}, {"Vary", "x"}, {"vary", "y"}});
  ASSERT_TRUE(answered->reply && answered->reply->httpRequest && answered->reply->httpResponse);
  EXPECT_EQ(answered->reply->httpRequest->url, lastTask().request().url);
  EXPECT_EQ(answered->reply->httpResponse->status, 200);
  EXPECT_THAT(answered->reply->httpResponse->headers,
              ElementsAre(std::pair<std::string, std::string>("Server", "a"),
                          std::pair<std::string, std::string>("Vary", "x, y")));
}

TEST_F(SearchFlowTest, GoesThroughTheProxyOnlyWhenItIsInUse) {
  struct Case {
    bool use;
    bool enabled;
    bool proxyFails;
    bool proxied;
  };
  for (const auto& wanted : std::vector<Case>{{true, true, false, true},
                                              {false, true, false, false},
                                              {true, false, false, false},
                                              {true, true, true, false}}) {
    SCOPED_TRACE(testing::Message() << wanted.use << wanted.enabled << wanted.proxyFails);
    QueryBed bed;
    bed.fakes.settings.set("ZLKUseMorvane", wanted.use);
    bed.fakes.networkProxy.enabled = wanted.enabled;
    if (wanted.proxyFails) bed.urlSession().setProxyError(urlError(URLErrorCode::CannotConnect));
    bed.installBag(kTestBag);
    bed.search(*bed.makeState(), "snow");
    const auto task = bed.urlSession().tasks().back();
    EXPECT_EQ(task->isProxyEnabled(), wanted.proxied);
    EXPECT_TRUE(task->isResumed());
    EXPECT_EQ(bed.fakes.log.contains("Enabling Morvane for request failed."), wanted.proxyFails);
  }
}

TEST_F(SearchFlowTest, AddsWhatTheProxyKnowsToTheRecordOfARoutedRequest) {
  bed_.fakes.settings.set("ZLKUseMorvane", true);
  bed_.fakes.networkProxy.enabled = true;
  bed_.installBag(kTestBag);
  bed_.search(*bed_.makeState(), "snow");
  lastTask().setConnectionInformation({{"proxy", "https://proxy.example:8443"}});
  answer(200, kOneResultSet);
  const auto records = bed_.records();
  const auto& end = dynamic_cast<const NetworkSearchEnd&>(*records.back().feedback);
  const auto timing = parseJson(end.networkTimingData->text)->as_object();
  EXPECT_TRUE(timing.contains("bytes_sent"));
  ASSERT_TRUE(timing.contains("Morvane"));
  EXPECT_EQ(timing.at("Morvane").at("proxy"), "https://proxy.example:8443");
}

TEST_F(SearchFlowTest, KeepsTypedTextOutOfTheLog) {
  bed_.installBag(kTestBag);
  const auto state = bed_.makeState();
  bed_.search(*state, "secret words", 1);
  answer(200, R"([{"query":"secret words of mine"}])");
  bed_.search(*state, "secret words", 2);
  bed_.search(*state, "other secret", 3);
  lastTask().fail(urlError(URLErrorCode::ConnectionLost));
  bed_.fakes.timeline.runUntilIdle();
  EXPECT_FALSE(bed_.fakes.log.contains("secret"));
  EXPECT_TRUE(
      bed_.fakes.log.contains("session lanthe performing query[1] <private>, reply (callback)"));
}

}  // namespace
}  // namespace zelkord
