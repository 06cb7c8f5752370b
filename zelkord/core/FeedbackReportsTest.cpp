#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "corezelkor/Constants.h"
#include "halvane/DaemonFeedback.h"
#include "halvane/FeedbackClasses.h"
#include "halvane/ModelFeedback.h"
#include "halvane/StoredFeedback.h"
#include "zelkord/assembly/UserAgent.h"
#include "zelkord/core/ClientQueryId.h"
#include "zelkord/core/DaemonTestSupport.h"
#include "zelkord/core/FeedbackReports.h"
#include "zelkord/feedback/FeedbackSeams.h"
#include "zelkord/feedback/RecordingSessions.h"
#include "zelkord/feedback/UserGUIDSource.h"

namespace zelkord {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

class HoldingFlusher final : public CrowdsourcingFlusher {
 public:
  std::vector<std::shared_ptr<const HVFeedback>> flushed;
  std::vector<std::function<void()>> callbacks;

  void flush(std::shared_ptr<const HVFeedback> feedback, std::function<void()> callback) override {
    flushed.push_back(std::move(feedback));
    callbacks.push_back(std::move(callback));
  }
};

std::string messageOf(const HVFeedback& feedback) {
  std::string bytes;
  feedback.appendTo(bytes);
  return bytes;
}

std::string payloadOf(const std::string& feedbackClass, std::string_view message) {
  std::string bytes;
  appendRecord(CZFeedbackPayload{feedbackClass, message}, bytes);
  return bytes;
}

HVSearchResult resultOfQuery(std::uint64_t queryId) {
  HVSearchResult result;
  result.queryId = queryId;
  return result;
}

HVResultSection sectionOfQueries(const std::vector<std::uint64_t>& queryIds) {
  HVResultSection section;
  for (const auto queryId : queryIds) section.results.push_back(resultOfQuery(queryId));
  return section;
}

template <typename T>
std::shared_ptr<T> feedbackWith(std::function<void(T&)> fill) {
  auto feedback = std::make_shared<T>();
  fill(*feedback);
  return feedback;
}

class FeedbackReportsTest : public testing::Test {
 protected:
  FeedbackReportsTest() {
    auto& assembly = bed_.daemon.assembly();
    assembly.clientSessionManager.set(manager_);
    assembly.feedbackSessions.set(sessions_);
  }

  DaemonBed::Answer report(const DaemonBed::Client& client, const std::string& feedbackClass,
                           const std::string& message, std::int64_t queryId = 5) {
    return bed_.call(client, "ReportEvent", {"event", queryId, feedbackClass, Data(message)});
  }
  DaemonBed::Answer report(const DaemonBed::Client& client, const HVFeedback& feedback,
                           std::int64_t queryId = 5) {
    return report(client, std::string(feedback.className()), messageOf(feedback), queryId);
  }
  DaemonBed::Answer reportData(const DaemonBed::Client& client, const std::string& payload) {
    return bed_.call(client, "ReportEventData", {"event", std::int64_t{5}, Data(payload)});
  }
  std::int64_t counter(const std::string& suffix) {
    return bed_.fakes.counters.value("com.quenta.zelkord." + suffix);
  }

  DaemonBed bed_{{{"TraceEnabled", true}}};
  const std::shared_ptr<RecordingSessionManager> manager_ =
      std::make_shared<RecordingSessionManager>("zelkord", true);
  const std::shared_ptr<RecordingSessions> sessions_ = std::make_shared<RecordingSessions>(true);
};

TEST_F(FeedbackReportsTest, RefusesWhatIsNoFeedbackOfAClient) {
  const auto view = [](std::int32_t event) {
    return messageOf(*feedbackWith<HVSearchViewAppearFeedback>(
        [event](auto& feedback) { feedback.triggerEvent = event; }));
  };
  const auto results = [](std::size_t count, std::int32_t type) {
    return messageOf(*feedbackWith<HVVisibleResultsFeedback>([=](auto& feedback) {
      for (std::size_t i = 1; i < count; ++i) feedback.results.push_back({});
      HVSearchResult last;
      last.resultType = type;
      feedback.results.push_back(last);
    }));
  };
  const std::string error = "HVErrorFeedback";
  const std::string badText("\x12\x03\x12\x01\xFF", 5);  // error.domain is not UTF-8
  const struct {
    const char* name;
    std::string feedbackClass;
    std::string message;
    std::string_view refusal;
  } cases[] = {
      {"no class", "", "", ipc::kInvalidArgs},
      {"unknown class", "HVNothingFeedback", "", ipc::kInvalidArgs},
      {"class that begins like one", "HVErrorFeedbackX", "", ipc::kInvalidArgs},
      {"record, not feedback", "CZZelkorFeedback", "", ipc::kInvalidArgs},
      {"the daemon's: cache hit", "ZLKCacheHitFeedback", "", ipc::kInvalidArgs},
      {"the daemon's: session end", "ZelkorSessionEndFeedback", "", ipc::kInvalidArgs},
      {"the daemon's: invalidation", "ZelkorConnectionInvalidated", "", ipc::kInvalidArgs},
      {"the daemon's message: skip", "CZSkipSearchFeedback", "", ipc::kInvalidArgs},
      {"the daemon's message: end", "CZSessionEndFeedback", "", ipc::kInvalidArgs},
      {"the daemon's message: lookup", "CZLookupStartNetworkSearchFeedback", "", ipc::kInvalidArgs},
      {"cut message", error, std::string("\x12\x05\x08", 3), ipc::kInvalidArgs},
      {"text that is not UTF-8", error, badText, ipc::kInvalidArgs},
      {"event above its table", "HVSearchViewAppearFeedback", view(27), ipc::kInvalidArgs},
      {"event below its table", "CZSearchViewAppearFeedback", view(-1), ipc::kInvalidArgs},
      {"a result's type above its table", "HVVisibleResultsFeedback", results(2, 999),
       ipc::kInvalidArgs},
      {"too many results", "HVVisibleResultsFeedback", results(70'000, 0), ipc::kLimitsExceeded},
  };
  const auto client = bed_.connectAndConfigure();
  const auto expectRefusal = [&](const DaemonBed::Answer& answer, std::string_view refusal) {
    EXPECT_EQ(answer->errorName, refusal);
    EXPECT_EQ(bed_.fakes.log.count(LogLevel::Error), 1);
    bed_.fakes.log.clear();
  };
  bed_.fakes.log.clear();
  for (const auto& [name, feedbackClass, message, refusal] : cases) {
    SCOPED_TRACE(name);
    expectRefusal(report(client, feedbackClass, message), refusal);
    expectRefusal(reportData(client, payloadOf(feedbackClass, message)), refusal);
  }
  const auto whole = payloadOf(error, view(0));
  expectRefusal(reportData(client, ""), ipc::kInvalidArgs);
  expectRefusal(reportData(client, whole.substr(0, whole.size() - 1)), ipc::kInvalidArgs);
  EXPECT_THAT(manager_->records().all(), IsEmpty());
  EXPECT_THAT(sessions_->completed().all(), IsEmpty());
  EXPECT_EQ(client->state(), ipc::FakeClient::State::Open);
}

TEST_F(FeedbackReportsTest, ACallerThatWaitsHearsThatThereIsNoRoom) {
  const auto client = bed_.connectAndConfigure();
  HVCustomFeedback autofill;
  autofill.feedbackType = 1;
  autofill.jsonFeedback = "{}";
  EXPECT_EQ(report(client, HVClearInputFeedback())->errorName, "");
  EXPECT_EQ(report(client, autofill)->errorName, "");
  manager_->isFull.set(true);
  sessions_->isFull.set(true);
  EXPECT_EQ(report(client, HVClearInputFeedback())->errorName, ipc::kLimitsExceeded);
  EXPECT_EQ(report(client, autofill)->errorName, ipc::kLimitsExceeded);
  EXPECT_EQ(report(bed_.connect(), HVClearInputFeedback())->errorName, ipc::kLimitsExceeded);
  EXPECT_EQ(client->state(), ipc::FakeClient::State::Open);
}

TEST_F(FeedbackReportsTest, BecomesARecordOfTheClientsSession) {
  const auto client = bed_.connectAndConfigure();
  const auto guid = bed_.daemon.assembly().guidController()->currentUserGUID();
  const auto agent = createUserAgentString("Lanthe/9", bed_.fakes.device);
  const auto now = static_cast<std::uint64_t>(bed_.fakes.timeline.now().time_since_epoch().count());
  for (const auto* name : {"HVStartSearchFeedback", "CZStartSearchFeedback", "CZZLKRankerFeedback",
                           "HVEndNetworkSearchFeedback", "CZResultGradingFeedback"}) {
    for (const std::uint64_t timestamp : {0, 77}) {
      SCOPED_TRACE(name);
      auto sent = feedbackClassNamed(name)->make();
      sent->timestamp = timestamp;
      manager_->flushSession({});
      const auto first = report(client, name, messageOf(*sent), -8);
      const auto second = reportData(client, payloadOf(name, messageOf(*sent)));
      EXPECT_TRUE(first->succeeded() && second->succeeded());
      EXPECT_TRUE(first->values.empty() && second->values.empty());
      const auto records = manager_->records().all();
      ASSERT_EQ(records.size(), 2u);
      EXPECT_EQ(records[0].queryId, -8);
      for (const auto& record : records) {
        EXPECT_EQ(record.feedback->className(), name);
        EXPECT_EQ(record.feedback->timestamp, timestamp ? timestamp : now);
        EXPECT_EQ(record.userGuid, guid);
        EXPECT_EQ(record.userAgent, agent);
      }
    }
  }
  EXPECT_EQ(bed_.fakes.log.count(LogLevel::Error), 0);
}

TEST_F(FeedbackReportsTest, OfAnUnboundConnectionIsAnErrorOfTheDaemon) {
  const auto client = bed_.connect();
  EXPECT_TRUE(report(client, HVStartSearchFeedback())->succeeded());
  EXPECT_TRUE(report(client, HVCustomFeedback())->succeeded());
  EXPECT_THAT(manager_->records().all(), IsEmpty());
  const auto completed = sessions_->completed().all();
  ASSERT_EQ(completed.size(), 2u);
  for (const auto& record : completed) {
    ASSERT_EQ(record.feedback->kind(), kKindOf<HVErrorFeedback>);
    EXPECT_EQ(static_cast<const HVErrorFeedback&>(*record.feedback).error,
              (HVError{500, "ZLKErrorDomain", "client state nil"}));
    EXPECT_EQ(record.queryId, 0);
    EXPECT_EQ(record.userGuid, bed_.daemon.assembly().guidController()->currentUserGUID());
    EXPECT_EQ(record.userAgent, zelkordUserAgent(bed_.fakes.device));
  }
  EXPECT_THAT(bed_.fakes.log.texts("Zelkor_Feedback"),
              ElementsAre("state must not be nil", "state must not be nil"));
  EXPECT_FALSE(bed_.call(client, "Feedback", {"any"})->answered);
}

TEST_F(FeedbackReportsTest, FeedbackAnswersWithTheSessionsRecords) {
  const ipc::Strings records = {R"({"rel_timestamp":0})", R"({"rel_timestamp":7})"};
  manager_->texts.set(records);
  const auto client = bed_.connectAndConfigure();
  const auto answer = bed_.call(client, "Feedback", {"any"});
  ASSERT_TRUE(answer->succeeded());
  EXPECT_EQ(*answer->values[0].get<ipc::Strings>(), records);
  EXPECT_TRUE(isNothing(*answer, 1));
}

TEST_F(FeedbackReportsTest, LeavesATraceOfEachReport) {
  const auto client = bed_.connectAndConfigure();
  bed_.fakes.trace.take();
  report(client, HVEndSearchFeedback());
  report(client, "HVNothingFeedback", "");
  report(bed_.connect(), HVEndSearchFeedback());
  EXPECT_THAT(bed_.fakes.trace.take(), ElementsAre(0x2B000024, 0x2B000028, 0x2B000024, 0x2B000028));
}

TEST_F(FeedbackReportsTest, WarmsTheConnectionWhenASearchViewAppears) {
  bed_.installBag(R"({"version":"4","warm_url":"https://w.example/w"})");
  const auto client = bed_.connectAndConfigure();
  std::vector<std::int32_t> warming;
  for (const bool onLockScreen : {false, true}) {
    for (std::int32_t event = 0; event < 27; ++event) {
      bed_.fakes.timeline.advance(31s);
      const auto before = bed_.urlSession().tasks().size();
      HVSearchViewAppearFeedback view;
      view.triggerEvent = event;
      view.onLockScreen = onLockScreen;
      report(client, view);
      if (bed_.urlSession().tasks().size() > before) warming.push_back(event);
    }
  }
  EXPECT_THAT(warming, ElementsAre(2, 5, 6, 9, 10, 11, 22, 23, 24));
  HVSearchViewDisappearFeedback other;
  other.triggerEvent = 2;
  bed_.fakes.timeline.advance(31s);
  report(client, other);
  EXPECT_EQ(bed_.urlSession().tasks().size(), warming.size());
}

TEST_F(FeedbackReportsTest, CountsAndDonatesEngagements) {
  const std::string input = R"({"input":"it's \"snow\" – 雪"})";
  const struct {
    const char* client;
    std::int32_t topHit;
    std::int32_t resultType;
    std::optional<std::string> query;
    bool countsTopHit;
    bool counts;
    std::string domain;  // empty: not donated
  } cases[] = {
      {"brelin", 1, 1, "it's \"snow\" – 雪", true, true, "Brelin"},
      {"com.quenta.Lanthe", 0, 1, "it's \"snow\" – 雪", false, true, "Lanthe"},
      {"lanthe", 2, 2, "", true, false, ""},
      {"lanthe", 0, 0, std::nullopt, false, false, ""},
      {"messages", 1, 1, "it's \"snow\" – 雪", true, true, ""},
      {"nameless", 1, 1, "it's \"snow\" – 雪", false, false, ""},
  };
  const std::vector<std::string> names = {"brelin", "lanthe", "messages"};
  const auto sum = [&](const std::string& suffix) {
    std::int64_t total = 0;
    for (const auto& name : names) total += counter(name + suffix);
    return total;
  };
  for (const auto& wanted : cases) {
    SCOPED_TRACE(wanted.client);
    const auto topHits = sum(".tophit.engagements");
    const auto engagements = sum(".zelkor.engagements");
    const auto donated = bed_.fakes.knowledge.donations().size();
    HVResultEngagementFeedback engagement;
    auto result = resultOfQuery(9);
    result.topHit = wanted.topHit;
    result.resultType = wanted.resultType;
    engagement.result = result;
    engagement.completedQuery = wanted.query;
    report(bed_.connectAndConfigure(wanted.client), engagement);
    EXPECT_EQ(manager_->records().all().back().clientQueryId, 9u);
    EXPECT_EQ(sum(".tophit.engagements") - topHits, wanted.countsTopHit);
    EXPECT_EQ(sum(".zelkor.engagements") - engagements, wanted.counts);
    const auto donations = bed_.fakes.knowledge.donations();
    ASSERT_EQ(donations.size() - donated, wanted.domain.empty() ? 0u : 1u);
    if (!wanted.domain.empty()) {
      EXPECT_EQ(donations.back(), (DonatedInteraction{wanted.domain, "Engagement", input,
                                                      bed_.fakes.timeline.wallNow()}));
    }
  }
  EXPECT_EQ(counter("lanthe.zelkor.engagements"), 1);
  EXPECT_TRUE(report(bed_.connectAndConfigure(), HVResultEngagementFeedback())->succeeded());
}

TEST_F(FeedbackReportsTest, CustomFeedbackGoesItsOwnWays) {
  const auto client = bed_.connectAndConfigure();
  const auto flusher = std::make_shared<HoldingFlusher>();
  const auto reportType = [&](std::int32_t type) {
    HVCustomFeedback custom;
    custom.feedbackType = type;
    custom.jsonFeedback = R"({"a":1})";
    return report(client, custom)->succeeded();
  };
  const auto callbacks = [this] { return bed_.fakes.log.texts("Zelkor_Flusher").size(); };

  EXPECT_TRUE(reportType(0));
  EXPECT_TRUE(reportType(2));  // nobody takes it yet
  EXPECT_EQ(counter("dp.submit"), 1);
  EXPECT_THAT(sessions_->completed().all(), IsEmpty());
  EXPECT_EQ(callbacks(), 0u);

  EXPECT_TRUE(reportType(1) && reportType(3));
  const auto completed = sessions_->completed().all();
  ASSERT_EQ(completed.size(), 2u);
  for (const auto& record : completed) {
    EXPECT_EQ(static_cast<const HVCustomFeedback&>(*record.feedback).jsonFeedback, R"({"a":1})");
    EXPECT_EQ(record.queryId, 5);
    EXPECT_EQ(record.userGuid, std::nullopt);
    EXPECT_EQ(record.userAgent, createUserAgentString("Lanthe/9", bed_.fakes.device));
  }
  EXPECT_EQ(callbacks(), 2u);

  bed_.daemon.assembly().crowdsourcingFeedbackFlusher.set(flusher);
  EXPECT_TRUE(reportType(2));
  EXPECT_EQ(counter("dp.submit"), 2);
  ASSERT_EQ(flusher->flushed.size(), 1u);
  EXPECT_EQ(callbacks(), 2u);
  flusher->callbacks[0]();
  EXPECT_EQ(bed_.fakes.log.texts("Zelkor_Flusher").back(), "flushed custom feedback");
  EXPECT_EQ(callbacks(), 3u);
  EXPECT_THAT(manager_->records().all(), IsEmpty());
}

TEST_F(FeedbackReportsTest, CrowdsourcingThatIsNoObjectIsDropped) {
  const auto client = bed_.connectAndConfigure();
  const auto flusher = std::make_shared<HoldingFlusher>();
  bed_.daemon.assembly().crowdsourcingFeedbackFlusher.set(flusher);
  bed_.fakes.log.clear();
  for (const auto* text : {"", "[1]", "{", "null", R"({"a":1} {})"}) {
    HVCustomFeedback custom;
    custom.feedbackType = HVCustomFeedback::kCrowdsourcing;
    custom.jsonFeedback = text;
    EXPECT_TRUE(report(client, custom)->succeeded());
  }
  EXPECT_THAT(sessions_->completed().all(), IsEmpty());
  EXPECT_THAT(flusher->flushed, IsEmpty());
  EXPECT_THAT(bed_.fakes.log.texts("Zelkor_Flusher"), IsEmpty());
  EXPECT_EQ(bed_.fakes.log.count("custom feedback is not a JSON object"), 5);
  EXPECT_EQ(bed_.fakes.log.count(LogLevel::Error), 5);
  EXPECT_EQ(counter("feedbacknotsent"), 5);
  EXPECT_EQ(counter("dp.submit"), 5);
}

TEST(ClientQueryIdTest, IsThatOfTheFirstResult) {
  const auto rank = [](auto& ranking) {
    HVResultRanking hiding;
    hiding.hiddenResults = {resultOfQuery(1)};
    HVResultRanking showing;
    showing.result = resultOfQuery(7);
    ranking.sections = {{1, {hiding}, {}}, {2, {{}, showing}, sectionOfQueries({2})}};
  };
  const auto full = sectionOfQueries({7, 8});
  const std::vector<std::shared_ptr<HVFeedback>> sevens = {
      feedbackWith<HVVisibleResultsFeedback>([&](auto& f) { f.results = full.results; }),
      feedbackWith<HVResultsReceivedAfterTimeoutFeedback>(
          [&](auto& f) { f.results = full.results; }),
      feedbackWith<HVResultEngagementFeedback>([](auto& f) { f.result = resultOfQuery(7); }),
      feedbackWith<HVSectionEngagementFeedback>([&](auto& f) { f.section = full; }),
      feedbackWith<HVVisibleSectionHeaderFeedback>([&](auto& f) { f.section = full; }),
      feedbackWith<HVLateSectionsAppendedFeedback>([&](auto& f) {
        f.sections = {{}, full};
      }),
      feedbackWith<HVRankingFeedback>(rank),
      feedbackWith<CZZLKRankerFeedback>(rank),
      feedbackWith<HVRankingFeedback>([&](auto& f) {
        f.sections = {{0, {}, full}};
      }),
  };
  for (const auto& feedback : sevens) {
    SCOPED_TRACE(feedback->className());
    EXPECT_EQ(clientQueryIdOf(*feedback), 7u);
    EXPECT_EQ(clientQueryIdOf(*feedbackClassNamed(feedback->className())->make()), 0u);
  }
  const auto grading =
      feedbackWith<HVResultGradingFeedback>([](auto& f) { f.result = resultOfQuery(7); });
  EXPECT_EQ(clientQueryIdOf(*grading), 0u);
  EXPECT_EQ(clientQueryIdOf(HVStartSearchFeedback()), 0u);
}

}  // namespace
}  // namespace zelkord
