#include <gtest/gtest.h>

#include "halvane/DaemonFeedback.h"
#include "zelkord/query/FlowKindsTestSupport.h"
#include "zelkord/query/LookupFlow.h"
#include "zelkord/query/QueryCache.h"
#include "zelkord/resources/LookupFilter.h"

namespace zelkord {
namespace {

// Drops results whose "id" is the text that was looked up.
struct DroppingFilter final : LookupFilter {
  bool filterLookupResultsWithRequest(const ZLKLookupRequest& request,
                                      json::value& response) const override {
    bool dropped = false;
    for (auto& set : response.as_array()) {
      auto& results = set.at("results").as_array();
      for (auto* result = results.begin(); result != results.end();) {
        const bool isUnfit = stringIn(result->as_object(), "id") == request.queryString;
        result = isUnfit ? results.erase(result) : result + 1;
        dropped |= isUnfit;
      }
    }
    return dropped;
  }
};

TEST(LookupFlowTest, GivesOnWhatIsLeftOfTheResults) {
  const std::string whole = R"([ {"query":"snow","status":"OK","fbq":"f",
      "results":[{"id":"a/b","score":0.50},{"id":"snow"}]} ])";
  const std::string left =
      R"([{"query":"snow","status":"OK","fbq":"f","results":[{"id":"a/b","score":0.5}]}])";
  const std::string fit = R"([ {"results":[{"id":"rain"}]} ])";
  for (const auto& kind : flowKinds()) {
    for (const auto& body : {whole, fit, std::string("[{")}) {
      SCOPED_TRACE(std::string(kind.name) + body);
      AskedQuery query(kind);
      query.bed.assembly.lookup.set(std::make_shared<DroppingFilter>());
      query.ask().succeed(200, body);
      if (kind.isStrict() && body == "[{") continue;
      ASSERT_TRUE(query.answer->reply);
      const bool isFiltered = kind.name == "lookup" && body == whole;
      EXPECT_EQ(query.answer->reply->data.view(), isFiltered ? left : body);
      // What is recorded is what came, and what is kept for later searches is the searches' own.
      EXPECT_EQ(query.record<NetworkSearchEnd>(1).responseSize,
                static_cast<std::int64_t>(body.size()));
      if (body == whole) {
        EXPECT_EQ(query.record<ZLKEndNetworkSearchFeedback>(1).fbq, "f");
      }
      EXPECT_EQ(query.state->queryCache()->count(), kind.isSearch() && body == whole ? 1u : 0u);
    }
  }
}

TEST(LookupFlowTest, RecordsTheWayTheTextWasSelected) {
  for (const auto& [type, recorded] :
       std::vector<std::pair<std::uint32_t, std::int32_t>>{{0, 0}, {1, 1}, {2, 2}, {3, 0}}) {
    SCOPED_TRACE(type);
    QueryBed bed;
    bed.installBag(kTestBag);
    ZLKLookupRequest request;
    request.lookupSelectionType = type;
    bed.ask(*bed.makeState(), request);
    const auto records = bed.records();
    const auto& start =
        dynamic_cast<const ZLKLookupStartNetworkSearchFeedback&>(*records[0].feedback);
    EXPECT_EQ(start.lookupSelectionType.value, recorded);
  }
}

TEST(LookupFlowTest, IsRepeatedUntilHalfASecondBeforeItsRendering) {
  struct Case {
    json::value renderTimeout;
    Duration failsAfter;
    bool repeated;
  };
  const std::vector<Case> cases = {
      {2000, 1500ms, true}, {2000, 1500ms + 1ns, false}, {nullptr, 0ms, false}, {499, 0ms, false},
      {500, 0ms, true},     {"2000", 0ms, false},
  };
  for (const auto& [renderTimeout, failsAfter, repeated] : cases) {
    SCOPED_TRACE(json::serialize(renderTimeout));
    QueryBed bed;
    bed.installBag(R"({"search_url":"https://s.example/s","search_render_timeout":)" +
                   json::serialize(renderTimeout) + "}");
    const auto answer = bed.ask(*bed.makeState(), ZLKLookupRequest());
    bed.fakes.timeline.advance(failsAfter);
    bed.urlSession().tasks().back()->fail(urlError(URLErrorCode::TimedOut));
    bed.fakes.timeline.runUntilIdle();
    EXPECT_EQ(bed.urlSession().tasks().size(), repeated ? 2u : 1u);
    EXPECT_EQ(answer->count, repeated ? 0 : 1);
    if (!repeated) continue;
    bed.urlSession().tasks().back()->succeed(200, "[]");
    bed.fakes.timeline.runUntilIdle();
    EXPECT_TRUE(answer->count == 1 && answer->reply);
  }
}

TEST(LookupFlowTest, TheDeadlineStaysWithinTheClock) {
  const auto now = SteadyTime(1000s);
  EXPECT_EQ(lookupDeadline(now, Duration::max()), SteadyTime::max());
  EXPECT_EQ(lookupDeadline(now, Duration::min()), now - 500ms);
}

}  // namespace
}  // namespace zelkord
