#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <limits>

#include "zelkord/assembly/UserAgent.h"
#include "zelkord/feedback/ClientSession.h"
#include "zelkord/feedback/ClientSessionShared.h"
#include "zelkord/feedback/FeedbackSeams.h"
#include "zelkord/feedback/SessionProcessingHelper.h"
#include "zelkord/feedback/SessionsTestSupport.h"

namespace zelkord {
namespace {

using testing::ElementsAre;

HVSearchResult resultNamed(const char* identifier) {
  HVSearchResult result;
  result.identifier = identifier;
  return result;
}

ZelkorFeedback at(std::uint64_t milliseconds, std::shared_ptr<HVFeedback> feedback,
                  std::optional<UUID> guid = std::nullopt) {
  feedback->timestamp = milliseconds * 1'000'000;
  auto record = SessionsBed::record(std::move(feedback));
  record.userGuid = guid;
  return record;
}

class ClientSessionTest : public testing::Test {
 protected:
  const RecordingContainer& container(std::size_t index = 0) {
    return *bed_.storage->containers.at(index);
  }
  // What is sent, once its number of records is what it says.
  json::object sent(ClientSession& session) {
    const auto sending = session.getFeedbacksToSend();
    auto object = parseJson(sending.text)->as_object();
    EXPECT_EQ(object.at("fb").as_array().size(), sending.records);
    return object;
  }
  // A session as it is read back.
  std::shared_ptr<ClientSession> stored(std::vector<ZelkorFeedback> records,
                                        CZClientSession header = {}) {
    return ClientSession::make(bed_.assembly, StoredSession{std::move(header), std::move(records)});
  }

  SessionsBed bed_;
};

TEST_F(ClientSessionTest, BeginsWithAHeader) {
  struct Versions final : ResourceVersions {
    std::map<std::string, std::string> resourceVersions() override {
      return {{"hints", "7"}, {"apps", "2"}};
    }
  };
  bed_.assembly.downloadManager.set(std::make_shared<Versions>());
  const UUID guid{{9}};
  const auto session = ClientSession::make(
      bed_.assembly, at(3, std::make_shared<HVErrorFeedback>(), guid), SessionEndReason::Idle);
  const auto& header = container().header;
  EXPECT_EQ(header.agent, "Lanthe/9");
  EXPECT_EQ(header.userGuidString, guid.string());
  EXPECT_EQ(header.previousSessionEndReason.text(), "session idle");
  EXPECT_FALSE(header.removeTimestamps);
  EXPECT_EQ(header.sessionStartSince1970, secondsSince1970(bed_.fakes.timeline.wallNow()));
  EXPECT_TRUE(header.firstUseOfTheDay);
  EXPECT_EQ(session->resourceVersions(), Versions().resourceVersions());
  EXPECT_EQ(bed_.counter("com.quenta.zelkord.Lanthe/9.sessions"), 1);
  EXPECT_THAT(container().classes(), ElementsAre("HVErrorFeedback"));
  EXPECT_TRUE(session->getSessionFeedbacks().empty());  // records lie on disk only
  session->sessionComplete();
  EXPECT_TRUE(container().isClosed);
}

TEST_F(ClientSessionTest, KeepsARecordOfAnotherUserAndSaysSo) {
  const auto session =
      ClientSession::make(bed_.assembly, at(1, std::make_shared<HVErrorFeedback>(), UUID{{1}}));
  session->addFeedback(at(2, std::make_shared<HVEndSearchFeedback>(), UUID{{2}}));
  session->addFeedback(at(3, std::make_shared<HVEndSearchFeedback>(), UUID{{1}}));
  session->addFeedback({});
  EXPECT_THAT(container().classes(), ElementsAre("HVErrorFeedback", "HVEndSearchFeedback",
                                                 "HVErrorFeedback", "HVEndSearchFeedback"));
  const auto& error = dynamic_cast<const HVErrorFeedback&>(*container().records[2].feedback);
  EXPECT_EQ(error.error, (HVError{500, "ZLKErrorDomain", "different guid in session"}));
  EXPECT_NE(error.timestamp, 0u);
  EXPECT_TRUE(bed_.fakes.log.contains("attempted to add a nil feedback"));
}

TEST_F(ClientSessionTest, WithoutAContainerItSaysSoAtItsEnd) {
  bed_.storage->isFull = true;
  const auto session = ClientSession::make(bed_.assembly, SessionsBed::record<HVErrorFeedback>());
  session->sessionComplete();
  EXPECT_TRUE(bed_.fakes.log.contains("Storage Handle nil major error"));
  EXPECT_EQ(bed_.fakes.log.count(LogLevel::Fault), 1);
}

TEST_F(ClientSessionTest, TakesItsUserAgentFromTheFirstRecordThatHasOne) {
  const auto session =
      ClientSession::make(bed_.assembly, SessionsBed::record<HVErrorFeedback>(std::nullopt));
  EXPECT_EQ(session->agent(), std::nullopt);
  session->addFeedback(SessionsBed::record<HVErrorFeedback>("Brelin/1"));
  session->addFeedback(SessionsBed::record<HVErrorFeedback>("Lanthe/9"));
  EXPECT_EQ(session->agent(), "Brelin/1");
}

TEST_F(ClientSessionTest, TestFeedbacksAreKeptInMemoryAndTold) {
  struct Streams final : FeedbackStreams {
    int records = 0;
    void sendDataToReceivingStreamListener(const ZelkorFeedback&) override { ++records; }
    void willAskForMoreResults(const std::string&) override {}
  };
  const auto streams = std::make_shared<Streams>();
  bed_.assembly.flusherXPCListener.set(streams);
  bed_.assembly.enableTestFeedbacks();
  const auto session =
      ClientSession::make(bed_.assembly, at(2000, std::make_shared<HVEndSearchFeedback>()));
  session->addFeedback(at(500, std::make_shared<HVStartSearchFeedback>()));
  EXPECT_THAT(session->feedbacksWithRelativeTimestamp(),
              ElementsAre(R"({"trigger_event":"unknown","input":null,"uuid":null,"query_id":0,)"
                          R"("type":"search_start","timestamp":0})",
                          R"({"uuid":null,"query_id":0,"type":"search_end","timestamp":1500})"));
  EXPECT_EQ(streams->records, 2);
}

TEST_F(ClientSessionTest, SendsItsHeaderInOrder) {
  CZClientSession header;
  header.agent = "A\"gent";
  header.userGuidString = UUID{{7}}.string();
  header.previousSessionEndReason = 4;
  header.sessionStartSince1970 = 1234.9;
  header.firstUseOfTheDay = true;
  header.cpResourceVersions = {{"hints", "1"}, {"hints", "2"}};
  EXPECT_EQ(stored({}, header)->getFeedbacksToSend().text,
            R"({"fb":[],"agent":"A\"gent","user_guid":"07000000-0000-0000-0000-000000000000",)"
            R"("resource_versions":{"hints":"2"},"first_use":true,"base_time":1234,)"
            R"("previous_session_end_reason":"guid changed"})");
  header.removeTimestamps = true;
  EXPECT_EQ(sent(*stored({}, header))["base_time"], 0);
  EXPECT_EQ(stored({})->getFeedbacksToSend().text,
            R"({"fb":[],"agent":"","user_guid":"","resource_versions":{},"first_use":false,)"
            R"("base_time":0,"previous_session_end_reason":"no previous session"})");
}

TEST_F(ClientSessionTest, FeaturesOfResultsHideTheTime) {
  auto features = std::make_shared<HVCustomFeedback>();
  features->feedbackType = 3;
  features->jsonFeedback = "{}";
  ClientSession::make(bed_.assembly, SessionsBed::record(features));
  EXPECT_TRUE(container().header.removeTimestamps);
}

TEST_F(ClientSessionTest, ReplacesIdentifiersAndAddsWhatIsMissing) {
  auto engagement = std::make_shared<HVResultEngagementFeedback>();
  engagement->result = resultNamed("secret a");
  auto second = std::make_shared<HVResultEngagementFeedback>();
  second->result = resultNamed("secret b");
  auto suggested = std::make_shared<HVSuggestionEngagementFeedback>();
  suggested->suggestion = HVSuggestion{.identifier = "secret s"};
  auto visible = std::make_shared<HVVisibleResultsFeedback>();
  visible->results = {resultNamed("secret b")};
  const auto session =
      stored({at(1000, engagement), at(1001, second), at(1005, suggested), at(1500, visible)});
  const auto text = session->getFeedbacksToSend().text;
  EXPECT_EQ(text.find("secret"), std::string::npos);
  const auto records = sent(*session).at("fb").as_array();
  ASSERT_EQ(records.size(), 6u);
  EXPECT_EQ(records[0].at("type"), "session_missing_suggestions");
  EXPECT_EQ(records[0].at("suggestions").at(0).at("id"), "3");
  EXPECT_EQ(records[1].at("type"), "session_missing_results");
  EXPECT_EQ(records[1].at("results").as_array().size(), 1u);
  EXPECT_EQ(records[1].at("results").at(0).at("id"), "1");
  EXPECT_EQ(records[2].at("result").at("id"), "1");
  EXPECT_EQ(records[3].at("result").at("id"), "2");
  EXPECT_EQ(records[4].at("id"), "3");
  EXPECT_EQ(records[5].at("results").at(0).at("id"), "2");
  const std::vector<int> times = {0, 0, 0, 1, 5, 500};
  for (std::size_t i = 0; i < times.size(); ++i) EXPECT_EQ(records[i].at("timestamp"), times[i]);
  EXPECT_EQ(session->getFeedbacksToSend().text, text);  // again the same
  EXPECT_EQ(*visible->results.front().identifier, "secret b");
}

TEST_F(ClientSessionTest, LeavesOutWhatJsonCannotExpress) {
  auto ranking = std::make_shared<HVRankingFeedback>();
  ranking->blendingDuration = std::numeric_limits<double>::infinity();
  auto custom = std::make_shared<HVCustomFeedback>();
  custom->jsonFeedback = "[1]";
  const auto session =
      stored({at(1, ranking), at(2, custom), at(3, std::make_shared<HVEndSearchFeedback>())});
  EXPECT_EQ(sent(*session)["fb"].as_array().size(), 1u);
  EXPECT_EQ(bed_.counter("com.quenta.zelkord.feedbacknotsent"), 2);
  EXPECT_EQ(at(1, ranking)
                .description(bed_.assembly.log(Category::FeedbackErrors), bed_.assembly.reporter()),
            std::nullopt);
  EXPECT_EQ(bed_.counter("com.quenta.zelkord.feedbacknotsent"), 3);
}

TEST_F(ClientSessionTest, ASharedOneKeepsAMemberForEachUserAgent) {
  bed_.assembly.enableTestFeedbacks();
  ClientSessionShared session(bed_.assembly, SessionsBed::record<HVErrorFeedback>("Lanthe/9"),
                              SessionEndReason::MaxTime);
  session.addFeedback(SessionsBed::record<HVEndSearchFeedback>("Brelin/1"));
  session.addFeedback(SessionsBed::record<HVEndSearchFeedback>("Lanthe/9"));
  session.addFeedback(SessionsBed::record<HVEndSearchFeedback>(std::nullopt));  // dropped
  ASSERT_EQ(bed_.storage->containers.size(), 2u);
  EXPECT_THAT(container(0).classes(), ElementsAre("HVErrorFeedback", "HVEndSearchFeedback"));
  EXPECT_THAT(container(1).classes(), ElementsAre("HVEndSearchFeedback"));
  for (const std::size_t index : {0, 1}) {
    EXPECT_EQ(container(index).previousEndReason(), "max session time passed");
  }
  std::vector<std::pair<std::string, bool>> visited;
  session.enumerateSessions(
      [&](ClientSession& member, bool isLast) { visited.emplace_back(*member.agent(), isLast); });
  EXPECT_THAT(visited, ElementsAre(std::pair("Brelin/1", false), std::pair("Lanthe/9", true)));
  EXPECT_EQ(session.getSessionFeedbacks().size(), 3u);
  EXPECT_EQ(session.feedbacksWithRelativeTimestamp().size(), 3u);
  EXPECT_EQ(session.privacyFilteredFeedbacksWithRelativeTimestamp().size(), 3u);
}

TEST_F(ClientSessionTest, AMemberWithoutUserTakesTheFirstThatARecordNames) {
  ClientSessionShared session(bed_.assembly, SessionsBed::record<HVErrorFeedback>(),
                              SessionEndReason::None);
  session.addFeedback(at(1, std::make_shared<HVEndSearchFeedback>(), UUID{{5}}));
  session.addFeedback(at(2, std::make_shared<HVEndSearchFeedback>(), UUID{{5}}));
  EXPECT_EQ(container().records.size(), 3u);  // no complaint of another user
  session.enumerateSessions(
      [&](ClientSession& member, bool) { EXPECT_EQ(member.userGuid(), UUID{{5}}); });
}

TEST_F(ClientSessionTest, FurtherUserAgentsShareTheDaemonsOwnMember) {
  const auto own = zelkordUserAgent(bed_.fakes.device);
  ClientSessionShared session(bed_.assembly, at(0, std::make_shared<HVEndSearchFeedback>()),
                              SessionEndReason::None);
  const auto add = [&](const std::string& agent, std::int64_t pid) {
    auto record = SessionsBed::record<HVEndSearchFeedback>(agent);
    record.pid = pid;
    session.addFeedback(std::move(record));
  };
  for (int i = 0; i < 1000; ++i) add("Flood/" + std::to_string(i), 7);
  // One process has a quarter of the members, and they hold what it records under them.
  EXPECT_EQ(bed_.storage->containers.size(), 1u + 16 + 1);
  EXPECT_EQ(bed_.storage->containers.back()->header.agent, own);
  EXPECT_EQ(bed_.storage->containers.back()->records.size(), 1000u - 16);
  EXPECT_EQ(bed_.storage->containers.back()->records.back().userAgent, own);
  add("Honest/1", 8);
  EXPECT_EQ(bed_.storage->containers.back()->header.agent, "Honest/1");
  for (int pid = 100; pid < 200; ++pid) add("Other/" + std::to_string(pid), pid);
  EXPECT_EQ(bed_.storage->containers.size(), 64u);
  EXPECT_EQ(bed_.counter("com.quenta.zelkord.limit.session_members"), 1000 - 16 + 100 - 45);
  std::size_t members = 0;
  session.enumerateSessions(
      [&](ClientSession&, bool isLast) { EXPECT_EQ(isLast, ++members == 64); });
}

TEST(SessionProcessingHelperTest, RemembersWhatIsNamedUntilItIsDescribed) {
  SessionProcessingHelper helper;
  EXPECT_EQ(helper.replacementForIdentifier("a"), "1");
  EXPECT_EQ(helper.replacementForIdentifier("b"), "2");
  EXPECT_EQ(helper.replacementForIdentifier("a"), "1");
  auto first = resultNamed("1");
  first.fbr = "first";
  helper.identifierReferencedForResult("a", first);
  helper.identifierReferencedForResult("a", resultNamed("1"));
  helper.identifierReferencedForResult("b", resultNamed("2"));
  helper.identifierExpanded("b");
  helper.identifierReferencedForResult("b", resultNamed("2"));
  HVSuggestion suggestion;
  helper.identifierReferencedForSuggestion("b", suggestion);
  helper.identifierReferencedForSuggestion("s", suggestion);
  ASSERT_EQ(helper.missingResults().size(), 1u);
  EXPECT_EQ(helper.missingResults().front().fbr, "first");
  EXPECT_EQ(helper.missingSuggestions().size(), 1u);
  helper.identifierExpanded("s");
  EXPECT_TRUE(helper.missingSuggestions().empty());
}

}  // namespace
}  // namespace zelkord
