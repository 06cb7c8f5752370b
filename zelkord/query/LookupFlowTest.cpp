#include <gtest/gtest.h>

#include "halvane/DaemonFeedback.h"
#include "zelkord/query/LookupFlow.h"
#include "zelkord/query/QueryTestSupport.h"

namespace zelkord {
namespace {

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
