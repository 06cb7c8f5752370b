#include <gtest/gtest.h>

#include "halvane/DaemonFeedback.h"
#include "zelkord/feedback/SessionsTestSupport.h"
#include "zelkord/feedback/ZelkorFeedback.h"

namespace zelkord {
namespace {

class ZelkorFeedbackTest : public testing::Test {
 protected:
  std::string sent(const ZelkorFeedback& record) {
    std::string text;
    EXPECT_TRUE(record.appendDictionary(errors(), text));
    return text;
  }
  const Logger& errors() const { return bed_.assembly.log(Category::FeedbackErrors); }

  SessionsBed bed_;
};

TEST_F(ZelkorFeedbackTest, TypesHaveTheNamesThatTheServiceKnows) {
  const char* const names =
      "visible_results,network_search_start,network_search_end,local_search_start,"
      "local_search_end,search_view_appear,search_view_disappear,rank_sections,"
      "result_engagement,visible_card,card_engagement,error,suggestion_engagement,"
      "card_view_disappear,search_start,search_end,visible_suggestions,custom_unknown,"
      "custom_crowdsourcing,custom_brelin_autofill,custom_lanthe_result_features,unknown,"
      "results_received_after_timeout,late_sections_appended,clear_input,session_end,"
      "skip_zelkor_search,section_engagement,visible_section_header,session_missing_results,"
      "session_missing_suggestions,did_go_to_site,connection_invalidated,result_grade,"
      "did_go_to_search,";
  std::string all;
  for (std::uint32_t type = 0; type < 35; ++type) all.append(eventTypeToString(type)).append(",");
  EXPECT_EQ(all, names);
}

TEST_F(ZelkorFeedbackTest, CarriesQueryIdentifiersOnlyWhereTheyBelong) {
  struct Case {
    std::shared_ptr<HVFeedback> feedback;
    std::int64_t queryId;
    std::uint64_t clientQueryId;
    std::string expected;
  };
  auto custom = std::make_shared<HVCustomFeedback>();
  custom->jsonFeedback = R"({"query_id":"mine","a":1,"type":2,"client_query_id":3})";
  auto anonymous = std::make_shared<HVCustomFeedback>(*custom);
  anonymous->feedbackType = 3;
  const std::vector<Case> cases = {
      {std::make_shared<HVDidGoToSiteFeedback>(), -5, std::numeric_limits<std::uint64_t>::max(),
       R"({"input":null,"query_id":-5,"client_query_id":18446744073709551615,)"
       R"("type":"did_go_to_site","timestamp":7})"},
      {std::make_shared<HVDidGoToSiteFeedback>(), 0, 0,
       R"({"input":null,"query_id":0,"type":"did_go_to_site","timestamp":7})"},
      {std::make_shared<HVEndLocalSearchFeedback>(), 3, 4,
       R"({"uuid":null,"type":"local_search_end","timestamp":7})"},
      {std::make_shared<ZelkorConnectionInvalidated>(), 3, 4,
       R"({"type":"connection_invalidated","timestamp":7})"},
      {custom, 1, 0,
       R"({"a":1,"client_query_id":3,"query_id":1,"type":"custom_unknown","timestamp":7})"},
      {custom, 1, 9,
       R"({"a":1,"query_id":1,"client_query_id":9,"type":"custom_unknown","timestamp":7})"},
      {anonymous, 1, 9,
       R"({"query_id":"mine","a":1,"client_query_id":3,"type":"custom_lanthe_result_features",)"
       R"("timestamp":7})"},
  };
  for (const auto& row : cases) {
    ZelkorFeedback record;
    record.feedback = row.feedback;
    record.queryId = row.queryId;
    record.clientQueryId = row.clientQueryId;
    record.relTimestamp = 7;
    EXPECT_EQ(sent(record), row.expected);
    EXPECT_EQ(json::value(record.dictionary(errors())), *parseJson(row.expected));
  }
}

TEST_F(ZelkorFeedbackTest, ItsDescriptionHasTheAbsoluteTime) {
  auto feedback = std::make_shared<HVEndSearchFeedback>();
  feedback->timestamp = 1'999'999;
  auto record = SessionsBed::record(feedback);
  record.relTimestamp = 99;
  EXPECT_EQ(record.description(errors(), bed_.assembly.reporter()),
            R"({"uuid":null,"query_id":0,"type":"search_end","timestamp":1})");
}

TEST_F(ZelkorFeedbackTest, OrdersByTheTimestampsOfTheFeedback) {
  const auto at = [](std::uint64_t timestamp) {
    auto feedback = std::make_shared<HVEndSearchFeedback>();
    feedback->timestamp = timestamp;
    return SessionsBed::record(std::move(feedback));
  };
  const auto most = std::numeric_limits<std::uint64_t>::max();
  EXPECT_EQ(timeStampComparator(at(1), at(1)), 0);
  EXPECT_EQ(timeStampComparator(at(most), at(1)), 1);
  EXPECT_EQ(timeStampComparator(at(1), at(most)), -1);
}

TEST_F(ZelkorFeedbackTest, NamesStreams) {
  EXPECT_EQ(convertIdentifierToString(1), "Feedbacks");
  EXPECT_EQ(convertIdentifierToString(0), "crowdsourcing");
  EXPECT_EQ(convertIdentifierToString(2), "");
}

}  // namespace
}  // namespace zelkord
