#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "halvane/DaemonFeedback.h"
#include "zelkord/feedback/FeedbackSeams.h"
#include "zelkord/network/exchange/ImageFetcher.h"
#include "zelkord/query/FlowKindsTestSupport.h"
#include "zelkord/query/QueryCache.h"
#include "zelkord/query/ResponseImages.h"

namespace zelkord {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;

constexpr const char* kFlowResponse =
    R"([{"status":"OK","query":"snowman","fbq":"f","partial_client_ip":"10.0","duration":2.5}])";

TEST(QueryFlowsTest, HandTheServicesBytesToTheClient) {
  for (const auto& kind : flowKinds()) {
    SCOPED_TRACE(kind.name);
    AskedQuery query(kind);
    query.bed.fakes.maps.session = "maps-session";
    query.ask();
    EXPECT_EQ(query.takeLog(), query.own(kind.sent));
    ASSERT_EQ(query.bed.urlSession().tasks().size(), 1u);
    EXPECT_EQ(query.answer->count, 0);
    query.succeed(200, kFlowResponse, {{"X-Quenta-ForceFetch", R"({"bag":12})"}});
    EXPECT_EQ(query.takeLog(), query.own(kind.answered));
    EXPECT_EQ(query.answer->count, 1);
    EXPECT_EQ(query.answer->queryId, 7);
    EXPECT_FALSE(query.answer->error);
    ASSERT_TRUE(query.answer->reply);
    const auto& reply = *query.answer->reply;
    EXPECT_EQ(reply.data.view(), kFlowResponse);
    EXPECT_EQ(reply.scale, 2);
    EXPECT_EQ(reply.geoSessionEntityString, "maps-session");
    EXPECT_FALSE(reply.httpRequest || reply.httpResponse);

    EXPECT_EQ(query.state->queryCache()->count(), kind.isSearch() ? 1u : 0u);
    EXPECT_EQ(query.clientCounter("fedapicall.serverstatus.200"), 1);
    EXPECT_EQ(query.clientCounter("keystrokes"), kind.isSearch());
    EXPECT_EQ(query.bed.counter("com.quenta.zelkord.search"), kind.isSearch());
    const auto bagSession = query.bed.fakes.urlSessions.find("bagSession");
    EXPECT_EQ(bagSession && !bagSession->tasks().empty(), kind.isSearch());
  }
}

TEST(QueryFlowsTest, RecordBothEndsOfTheRequest) {
  for (const auto& kind : flowKinds()) {
    SCOPED_TRACE(kind.name);
    AskedQuery query(kind);
    query.ask(true);
    query.task().setTimingData(
        {.bytesSent = 99, .reused = true, .interface = "eth0", .peerAddress = "10.0.0.1:443"});
    query.succeed(200, kFlowResponse);
    EXPECT_THAT(query.bed.recordedClasses(),
                ElementsAre(kind.startClass, "ZLKEndNetworkSearchFeedback"));
    const auto& start = query.record<NetworkSearchStart>(0);
    EXPECT_EQ(start.input, kind.input);
    EXPECT_EQ(start.triggerEvent.value, static_cast<std::int32_t>(kind.trigger));
    EXPECT_EQ(start.endpointType.value, kind.endpoint);
    EXPECT_EQ(start.uuid, "uuid of snow");
    EXPECT_EQ(start.url, query.task().request().url);
    const auto& headers = query.task().request().headers;
    EXPECT_EQ(start.headers, StringMap(headers.begin(), headers.end()));
    const auto records = query.bed.records();
    EXPECT_EQ(records[0].clientQueryId, 70u);
    EXPECT_EQ(records[1].clientQueryId, 0u);
    for (const auto& record : records) {
      EXPECT_EQ(record.queryId, 7);
      EXPECT_TRUE(record.userGuid);
      EXPECT_EQ(record.userAgent, "Lanthe/9");
    }
    const auto& end = query.record<ZLKEndNetworkSearchFeedback>(1);
    EXPECT_EQ(end.uuid, start.uuid);
    EXPECT_EQ(end.connectionReused, true);
    EXPECT_EQ(end.interface, "eth0");
    EXPECT_EQ(end.peerAddress, "10.0.0.1:443");
    EXPECT_EQ(end.statusCode, 200);
    EXPECT_EQ(end.responseSize, static_cast<std::int64_t>(std::string_view(kFlowResponse).size()));
    const auto timing = parseJson(end.networkTimingData->text)->as_object();
    EXPECT_EQ(timing.at("bytes_sent"), 99);
    EXPECT_TRUE(timing.at("tls").is_null());  // it did not happen
    EXPECT_EQ(end.zelkorStatus, "OK");
    EXPECT_EQ(end.fbq, "f");
    EXPECT_EQ(end.partialClientIp, "10.0");
    EXPECT_EQ(end.zelkorDuration, 2.5);
    ASSERT_TRUE(query.answer->reply && query.answer->reply->httpRequest);
    EXPECT_EQ(query.answer->reply->httpRequest->url, start.url);
  }
}

TEST(QueryFlowsTest, WaitForABagOnlyWhereTheyNeedOne) {
  for (const auto& kind : flowKinds()) {
    SCOPED_TRACE(kind.name);
    AskedQuery query(kind, nullptr);
    const auto begin = query.bed.fakes.timeline.now();
    query.ask();
    const auto waited = query.bed.fakes.timeline.now() - begin;
    EXPECT_EQ(query.clientCounter("keystrokes"), kind.isSearch());
    if (!kind.gated) {
      EXPECT_EQ(waited, 0s);
      ASSERT_EQ(query.bed.urlSession().tasks().size(), 1u);
      EXPECT_EQ(query.task().request().timeout, 30s);
      EXPECT_FALSE(query.task().request().header("User-Agent"));
      query.succeed(200, "[]");
      EXPECT_TRUE(query.answer->reply);
      continue;
    }
    EXPECT_EQ(waited, 1s);
    EXPECT_EQ(query.answer->count, 1);
    EXPECT_EQ(query.answer->error, zelkorError(1, "timeout"));
    EXPECT_EQ(query.takeLog().back(), kind.noBag);
    EXPECT_THAT(query.bed.recordedClasses(), ElementsAre("ZLKSkipSearchFeedback"));
    const auto& skip = query.record<ZLKSkipSearchFeedback>(0);
    EXPECT_EQ(skip.triggerEvent.value, 3);
    EXPECT_EQ(skip.input, kind.input);
  }
}

TEST(QueryFlowsTest, MindWhatTheBagForbidsOnlyWhereTheyNeedOne) {
  for (const auto& kind : flowKinds()) {
    SCOPED_TRACE(kind.name);
    AskedQuery query(kind, R"({"enabled":false,"search_url":"https://s.example/s"})");
    query.ask();
    EXPECT_EQ(query.bed.urlSession().tasks().empty(), kind.gated);
    EXPECT_EQ(query.clientCounter("keystrokes"), kind.isSearch());
    if (!kind.gated) continue;
    EXPECT_EQ(query.answer->count, 1);
    EXPECT_FALSE(query.answer->reply || query.answer->error);
    EXPECT_EQ(query.takeLog().back(), kind.disabled);
    EXPECT_THAT(query.bed.recordedClasses(), ElementsAre("ZLKSkipSearchFeedback"));
    const auto& skip = query.record<ZLKSkipSearchFeedback>(0);
    EXPECT_EQ(skip.triggerEvent.value, 2);
    EXPECT_EQ(skip.input, kind.input);
    EXPECT_EQ(query.bed.records()[0].clientQueryId, 70u);
  }
}

TEST(QueryFlowsTest, OnlySearchesMindTheLengthOfTheText) {
  for (const auto& kind : flowKinds()) {
    SCOPED_TRACE(kind.name);
    AskedQuery query(kind, R"({"search_url":"https://s.example/s","minimum_query_length":5})");
    query.ask();
    EXPECT_EQ(query.bed.urlSession().tasks().empty(), kind.isSearch());
    EXPECT_EQ(query.clientCounter("keystrokes"), kind.isSearch());
  }
}

TEST(QueryFlowsTest, ReportATransportErrorAfterTheirRetries) {
  const auto failure = urlError(URLErrorCode::ConnectionLost);
  for (const auto& kind : flowKinds()) {
    SCOPED_TRACE(kind.name);
    AskedQuery query(kind);
    query.bed.urlSession().setOnResume([&](FakeURLTask& task) { task.fail(failure); });
    const auto begin = query.bed.fakes.timeline.now();
    query.ask();
    EXPECT_EQ(query.bed.fakes.timeline.now(), begin);
    EXPECT_EQ(static_cast<int>(query.bed.urlSession().tasks().size()), kind.requests);
    EXPECT_EQ(query.answer->count, 1);
    EXPECT_EQ(query.answer->error, failure);
    EXPECT_THAT(query.bed.recordedClasses(),
                ElementsAre(kind.startClass, "HVErrorFeedback", "HVEndNetworkSearchFeedback"));
    for (const auto& record : query.bed.records()) EXPECT_EQ(record.clientQueryId, 70u);
    EXPECT_FALSE(query.bed.records().back().userGuid);
    EXPECT_EQ(query.clientCounter("noconnection"), 1);
    EXPECT_EQ(query.bed.fakes.log.count("resp: (null)"), kind.answered.empty() ? 0 : 1);
    const auto text =
        kind.isStrict() ? kind.strict + std::string(" fetch failed with HTTP status code 0 error ")
                        : "error with request ";
    EXPECT_EQ(query.takeLog().back(), query.error(text + failure.description()));
  }
}

// What comes back instead of a list with status 200.
TEST(QueryFlowsTest, TakeOnlyTheAnswersTheyCanUse) {
  enum class Strict { FetchFailed, NotAList, Taken };
  struct Reply {
    const char* name;
    std::optional<int> status;
    std::string body;
    Strict strict;
  };
  const std::string deep(513, '[');
  const std::vector<Reply> replies = {
      {"status 404", 404, "[]", Strict::FetchFailed},
      {"status 204", 204, "", Strict::FetchFailed},
      {"not HTTP", std::nullopt, "[]", Strict::FetchFailed},
      {"an object", 200, R"({"results":[]})", Strict::NotAList},
      {"null", 200, "null", Strict::NotAList},
      {"empty", 200, "", Strict::NotAList},
      {"broken", 200, "[{", Strict::NotAList},
      {"two documents", 200, "[][]", Strict::NotAList},
      {"not UTF-8", 200, "[\"\xFF\"]", Strict::NotAList},
      {"513 deep", 200, deep + std::string(513, ']'), Strict::NotAList},
      {"5 MB, broken", 200, "[\"" + std::string(5 << 20, 'x'), Strict::NotAList},
      {"512 deep", 200, deep.substr(1) + std::string(512, ']'), Strict::Taken},
      {"5 MB", 200, "[\"" + std::string(5 << 20, 'x') + "\"]", Strict::Taken},
      {"an empty list", 200, "[]", Strict::Taken},
      {"a list of anything", 200, R"([1,null,"x",[],{}])", Strict::Taken},
      {"wrong types", 200,
       R"([{"status":1,"query":[],"completion_score":"x","max_age":{},"fbq":2,)"
       R"("partial_client_ip":null,"duration":"5","results":7},{"results":[1,{"image":3}]}])",
       Strict::Taken},
  };
  for (const auto& kind : flowKinds()) {
    for (const auto& reply : replies) {
      SCOPED_TRACE(std::string(kind.name) + ", " + reply.name);
      AskedQuery query(kind);
      const auto body = Data(reply.body);
      query.ask().finish({.data = body, .response = URLResponse{"https://x", reply.status, {}}});

      const bool fails = kind.isStrict() ? reply.strict != Strict::Taken : !reply.status;
      std::optional<Error> error;
      if (!kind.isStrict() && fails) error = zelkorError(500, "invalid response class");
      if (kind.isStrict() && reply.strict == Strict::NotAList) {
        error = zelkorError(500, "invalid response");
      }
      EXPECT_EQ(query.answer->count, 1);
      EXPECT_EQ(query.answer->error, error);
      ASSERT_EQ(query.answer->reply.has_value(), !fails);
      if (!fails) {
        EXPECT_EQ(query.answer->reply->data, body);
      }
      if (reply.strict == Strict::NotAList) {
        EXPECT_EQ(query.state->queryCache()->count(), 0u);
      }
      EXPECT_EQ(query.clientCounter("noconnection"), error ? 1 : 0);
      EXPECT_EQ(query.bed.fakes.log.count(LogLevel::Error), fails ? 1 : 0);
      ASSERT_EQ(query.bed.records().size(), error ? 3u : 2u);
      const auto& end = query.record<NetworkSearchEnd>(error ? 2 : 1);
      EXPECT_EQ(end.statusCode, reply.status.value_or(0));
      EXPECT_EQ(end.responseSize, static_cast<std::int64_t>(body.size()));
      const auto& record = *query.bed.records().back().feedback;
      if (const auto* full = dynamic_cast<const ZLKEndNetworkSearchFeedback*>(&record)) {
        EXPECT_FALSE(full->zelkorStatus || full->fbq || full->partialClientIp ||
                     full->zelkorDuration);
      }
    }
  }
}

TEST(QueryFlowsTest, TellWhyAnAnswerIsRefused) {
  struct Case {
    std::optional<int> status;
    std::string body;
    bool showsPrivateData;
    std::string strict;
    std::string lenient;  // empty: taken
  };
  const std::string unreadable =
      "Failed to deserialize card details for into a dictionary. Error: ";
  const std::vector<Case> cases = {
      {std::nullopt, "", false, " fetch failed with HTTP status code 0 error (null)",
       R"(not http response? {"url":"https://x"})"},
      {404, "[]", false, " fetch failed with HTTP status code 404 error (null)", ""},
      {200, "{}", false, unreadable + "(null). Response data: \"<private>\"", ""},
      {200, "{}", true, unreadable + "(null). Response data: \"{}\"", ""},
      {200, "\xFF", true, unreadable + "syntax error. Response data: \"(null)\"", ""},
  };
  for (const auto& kind : flowKinds()) {
    for (const auto& wanted : cases) {
      SCOPED_TRACE(std::string(kind.name) + wanted.strict);
      AskedQuery query(kind);
      query.bed.fakes.log.setShowsPrivateData(wanted.showsPrivateData);
      query.ask().finish(
          {.data = Data(wanted.body), .response = URLResponse{"https://x", wanted.status, {}}});
      const auto last = query.takeLog().back();
      if (kind.isStrict()) {
        const auto* name = wanted.status == 200 ? "" : kind.strict;
        EXPECT_EQ(last, query.error(name + wanted.strict));
      } else if (!wanted.lenient.empty()) {
        EXPECT_EQ(last, query.error(wanted.lenient));
      }
    }
  }
}

TEST(QueryFlowsTest, AnAnswerThatWasCutOffIsATransportError) {
  const auto failure = urlError(URLErrorCode::ConnectionLost);
  for (const auto& kind : flowKinds()) {
    SCOPED_TRACE(kind.name);
    AskedQuery query(kind, R"({"search_url":"https://s.example/s"})");
    query.ask().finish(
        {.data = Data("[]"), .response = URLResponse{"https://x", 200, {}}, .error = failure});
    EXPECT_EQ(query.answer->error, failure);
    EXPECT_FALSE(query.answer->reply);
    EXPECT_EQ(query.clientCounter("fedapicall.serverstatus.200"), 1);
  }
}

TEST(QueryFlowsTest, GoThroughTheProxyWhereTheyMay) {
  for (const auto& kind : flowKinds()) {
    for (const bool fails : {false, true}) {
      SCOPED_TRACE(kind.name);
      AskedQuery query(kind);
      query.bed.fakes.settings.set("ZLKUseMorvane", true);
      query.bed.fakes.networkProxy.enabled = true;
      if (fails) query.bed.urlSession().setProxyError(urlError(URLErrorCode::CannotConnect));
      query.ask();
      EXPECT_EQ(query.task().request().routed, kind.routed);
      EXPECT_EQ(query.task().isProxyEnabled(), kind.routed && !fails);
      EXPECT_TRUE(query.task().isResumed());
      const auto lines = query.bed.fakes.log.texts("Zelkor_Connection");
      EXPECT_EQ(testing::Matches(testing::Contains("Enabling Morvane for request failed."))(lines),
                kind.routed && fails);
    }
  }
}

TEST(QueryFlowsTest, WithholdTheLocationForMessagesWhereTheyMay) {
  for (const auto& kind : flowKinds()) {
    for (const bool messages : {false, true}) {
      SCOPED_TRACE(kind.name);
      AskedQuery query(kind);
      query.state->adoptUserAgent(messages ? "com.quenta.MESSAGES/2" : "Lanthe/9");
      query.ask();
      const bool tells = query.task().request().url.find("geosrc=") != std::string::npos;
      EXPECT_EQ(tells, !(kind.masked && messages));
    }
  }
}

TEST(QueryFlowsTest, KeepTheConnectionWarmAndTellOfSearches) {
  constexpr const char* kWithLocation = R"({"search_url":"https://s.example/s",
      "warm_url":"https://s.example/w","supported_geo_location_sources":["gps"]})";
  for (const auto& kind : flowKinds()) {
    SCOPED_TRACE(kind.name);
    AskedQuery query(kind, kWithLocation);
    auto& bed = query.bed;
    const auto now = bed.fakes.timeline.now();
    bed.fakes.location.deliver(
        {{.latitude = 37.7749, .longitude = -122.4194, .type = 1, .time = now}});
    bed.fakes.timeline.runUntilIdle();
    const auto placeOfDownloads = [&] {
      return bed.assembly.requestFactory()
          ->fileDownloadRequest("https://d.example/f", "", true)
          ->header("X-Quenta-FuzzedLatLong");
    };
    ASSERT_EQ(placeOfDownloads(), "37.000000,-122.000000");
    query.ask();
    EXPECT_EQ(placeOfDownloads() != "37.000000,-122.000000", kind.performsSearch);
    query.state->warm();
    EXPECT_EQ(bed.urlSession().tasks().size(), 1u);
  }
}

TEST(QueryFlowsTest, LearnTheImageHostsOfAnswersTheyTake) {
  const std::string list = R"([{"results":[{"icon":{"url":"https://img.example/known"}}]}])";
  for (const auto& kind : flowKinds()) {
    for (const auto& body : {list, R"({"sections":)" + list + "}"}) {
      SCOPED_TRACE(std::string(kind.name) + body);
      AskedQuery query(kind);
      auto& assembly = query.bed.assembly;
      assembly.imageFetcher.set(std::make_shared<ImageFetcher>(assembly));
      assembly.responseImages.set(std::make_shared<ResponseImages>(assembly));
      query.state->_ensureBag();
      query.ask().succeed(200, body);
      assembly.responseImages()
          ->loadImages({{{.url = "https://img.example/next"}}, query.bed.fakes.timeline.now(), ""},
                       [](const auto&) {})
          ->ask();
      query.bed.fakes.timeline.runUntilIdle();
      const bool learnt = query.task().request().url == "https://img.example/next";
      EXPECT_EQ(learnt, !kind.isStrict() || body == list);
    }
  }
}

TEST(QueryFlowsTest, WithoutAURLThereIsNoRequestAndNoRecord) {
  QueryBed bed;
  bed.installBag(R"({"minimum_query_length":0})");
  const auto state = bed.makeState();
  ZLKCardRequest unusable;
  unusable.cardURL = "card";
  const std::vector<Answered> answers = {
      bed.ask(*state, ZLKSearchRequest()),
      bed.ask(*state, ZLKZeroKeywordRequest()),
      bed.ask(*state, ZLKMoreResultsRequest()),
      bed.ask(*state, ZLKCardRequest()),
      bed.ask(*state, unusable),
      bed.ask(*state, ZLKLookupRequest()),
  };
  for (const auto& answer : answers) {
    EXPECT_EQ(answer->count, 1);
    EXPECT_EQ(answer->error, zelkorError(1, "no URL"));
  }
  EXPECT_TRUE(bed.urlSession().tasks().empty());
  EXPECT_TRUE(bed.records().empty());
}

TEST(QueryFlowsTest, FollowUpsGoToTheBagsURLWhenTheyHaveNone) {
  QueryBed bed;
  bed.installBag(kFlowBag);
  const auto state = bed.makeState();
  state->_ensureBag();
  bed.ask(*state, ZLKMoreResultsRequest());
  bed.ask(*state, ZLKCardRequest());
  const auto tasks = bed.urlSession().tasks();
  ASSERT_EQ(tasks.size(), 2u);
  EXPECT_THAT(tasks[0]->request().url, HasSubstr("https://m.example/bag?"));
  EXPECT_THAT(tasks[1]->request().url, HasSubstr("https://c.example/card?"));
}

TEST(QueryFlowsTest, MoreResultsTellWhoWatchesWhoseTheyAre) {
  struct Watching final : FeedbackStreams {
    std::vector<std::string> queries;
    void sendDataToReceivingStreamListener(const ZelkorFeedback&) override {}
    void willAskForMoreResults(const std::string& query) override { queries.push_back(query); }
  };
  for (const bool isWatched : {false, true}) {
    QueryBed bed;
    bed.installBag(kFlowBag);
    const auto state = bed.makeState();
    state->_ensureBag();
    const auto streams = std::make_shared<Watching>();
    if (isWatched) bed.assembly.flusherXPCListener.set(streams);
    for (const auto& kind : flowKinds()) kind.ask(bed, *state, false);
    EXPECT_EQ(streams->queries, std::vector<std::string>(isWatched ? 1 : 0, "snow man"));
    for (const auto* url : {"", "https://m.example/", "https://m.example/?q", "https://m/?q=%FF"}) {
      SCOPED_TRACE(url);
      ZLKMoreResultsRequest request;
      request.moreResultsURL = url;
      bed.ask(*state, request);
      const auto start = bed.records().back().feedback;
      EXPECT_EQ(dynamic_cast<const NetworkSearchStart&>(*start).input, "");
    }
    EXPECT_EQ(streams->queries.size(), isWatched ? 5u : 0u);
  }
}

TEST(QueryFlowsTest, FlightsAreAnsweredAtOnceWithNothing) {
  QueryBed bed;
  const auto state = bed.makeState();
  ZLKFlightSearchRequest search;
  search.queryId = 8;
  ZLKFlightLookupRequest lookup;
  lookup.queryId = 8;
  for (const auto& answer : {bed.ask(*state, search), bed.ask(*state, lookup)}) {
    EXPECT_EQ(answer->count, 1);
    EXPECT_EQ(answer->queryId, 8);
    EXPECT_FALSE(answer->reply || answer->error);
  }
  EXPECT_TRUE(bed.records().empty());
}

}  // namespace
}  // namespace zelkord
