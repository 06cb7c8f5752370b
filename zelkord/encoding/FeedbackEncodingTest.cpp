#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <limits>
#include <map>
#include <random>

#include "halvane/DaemonFeedback.h"
#include "halvane/FeedbackClasses.h"
#include "platform/testing/RecordingLog.h"
#include "zelkord/encoding/ErrorEncoding.h"
#include "zelkord/encoding/FeedbackEncoding.h"
#include "zelkord/encoding/JsonWriting.h"
#include "zelkord/encoding/RecordProperties.h"

namespace zelkord {
namespace {

template <typename T>
std::shared_ptr<T> made(const std::function<void(T&)>& fill = {}) {
  auto feedback = std::make_shared<T>();
  if (fill) fill(*feedback);
  return feedback;
}

HVSearchResult fullResult(std::int32_t type = 1) {
  HVSearchResult result;
  result.identifier = "r";
  result.score = 0.5;
  result.resultType = type;
  result.publiclyIndexable = true;
  result.topHit = 2;
  result.sectionBundleIdentifier = "sb";
  result.bundleIdentifier = "b";
  result.fbr = "f";
  result.localFeatures = JsonText(R"( {"a": [1, 2]} )");
  result.correctedQuery = "c";
  result.hasTitle = true;
  result.title = "Title";
  result.punchout = HVPunchout{{}, {}, {"relative/x", "https://p.example/"}};
  result.action = HVActionItem{{}, HVPunchout{{}, {}, {"tel:1"}}};
  return result;
}

constexpr const char* kFullResult =
    R"({"id":"r","score":0.5,"result_type":"zelkor","publicly_indexable":true,)"
    R"("top_hit":"tophit_must_be","section_bundle_id":"sb","bundle_id":"b","fbr":"f",)"
    R"("local_features":{"a": [1, 2]},"corrected_query":"c","static_correction":false})";
constexpr const char* kEmptyResult =
    R"({"id":null,"score":null,"result_type":"unknown","publicly_indexable":false,)"
    R"("top_hit":"tophit_no","section_bundle_id":null,"bundle_id":null,"fbr":null,)"
    R"("local_features":null,"corrected_query":null,"static_correction":false})";

HVSuggestion suggestion(std::optional<std::string> fbr) {
  HVSuggestion item;
  item.identifier = "s";
  item.suggestion = "snow";
  item.score = 2;
  item.suggestionType = 3;
  item.fbr = std::move(fbr);
  return item;
}

HVResultSection section() { return {"sec", 1.5, std::nullopt, {fullResult()}}; }

std::vector<HVSectionRanking> sectionRankings() {
  HVResultRanking row;
  row.localResultPosition = 3;
  row.hiddenResults = {fullResult()};
  row.result = fullResult();
  return {{1, {row}, section()}};
}

void changeResult(HVResultEngagementFeedback& engagement,
                  const std::function<void(HVSearchResult&)>& change) {
  auto result = *engagement.result;
  change(result);
  engagement.result = result;
}

template <typename T>
void fillStartRecord(T& start) {
  start.triggerEvent = 1;
  start.input = "snow";
  start.uuid = "U";
  start.headers = {{"B", "2"}, {"A", "1"}};
  start.url = "https://s.example/?q=snow";
  start.endpointType = 6;
}

struct Row {
  std::shared_ptr<HVFeedback> feedback;
  std::uint32_t type;
  bool needsQueryId;
  std::string members;
};

std::string withResult(std::string text) {
  for (auto at = text.find('@'); at != std::string::npos; at = text.find('@', at)) {
    text.replace(at, 1, kFullResult);
  }
  return text;
}

std::vector<Row> rows() {
  return {
      {made<HVVisibleResultsFeedback>([](auto& f) {
         f.triggerEvent = 14;
         f.results = {fullResult(), {}};
       }),
       0, true, withResult(R"("trigger_event":"arrow_down","results":[@,)") + kEmptyResult + "]"},
      {made<HVStartNetworkSearchFeedback>([](auto& f) { fillStartRecord(f); }), 1, true,
       R"("trigger_event":"new_character","input":"snow","uuid":"U","headers":{"A":"1","B":"2"},)"
       R"("url":"https://s.example/?q=snow","endpoint_type":"zelkor_search")"},
      {made<ZLKLookupStartNetworkSearchFeedback>([](auto& f) {
         fillStartRecord(f);
         f.lookupSelectionType = 2;
       }),
       1, true,
       R"("trigger_event":"lookup_hint_tap","input":"snow","uuid":"U",)"
       R"("headers":{"A":"1","B":"2"},"url":"https://s.example/?q=snow",)"
       R"("endpoint_type":"zelkor_search")"},
      {made<HVEndNetworkSearchFeedback>([](auto& f) {
         f.responseSize = -1;
         f.statusCode = 200;
         f.networkTimingData = JsonText(R"({"tls":null})");
         f.connectionReused = false;
         f.peerAddress = "[::1]:443";
       }),
       2, false,
       R"("response_size":-1,"status_code":200,"network_timing_data":{"tls":null},)"
       R"("connection_reused":false,"interface":null,"peer_address":"[::1]:443","uuid":null)"},
      {made<ZLKEndNetworkSearchFeedback>([](auto& f) {
         f.uuid = "U";
         f.zelkorStatus = "OK";
         f.zelkorDuration = 2.25;
       }),
       2, false,
       R"("response_size":0,"status_code":0,"network_timing_data":null,"connection_reused":null,)"
       R"("interface":null,"peer_address":null,"uuid":"U","zelkor_status":"OK",)"
       R"("zelkor_duration":2.25,"fbq":null,"zelkor_partial_client_ip":null)"},
      {made<HVStartLocalSearchFeedback>([](auto& f) { f.indexType = 3; }), 3, true,
       R"("trigger_event":"unknown","input":null,"uuid":null,"index_type":"core_kinlo")"},
      {made<HVEndLocalSearchFeedback>(), 4, false, R"("uuid":null)"},
      {made<HVSearchViewAppearFeedback>([](auto& f) {
         f.triggerEvent = 26;
         f.isOverApp = true;
       }),
       5, true,
       R"("trigger_event":"did_enter_foreground","on_lock_screen":false,"is_over_app":true)"},
      {made<HVSearchViewDisappearFeedback>([](auto& f) { f.triggerEvent = 24; }), 6, true,
       R"("trigger_event":"go_to_site")"},
      {made<HVRankingFeedback>([](auto& f) {
         f.blendingDuration = 3;
         f.sections = sectionRankings();
       }),
       7, true,
       withResult(R"("blending_duration":3,"sections":[{"local_section_position":1,"results":[)"
                  R"({"local_result_position":3,"hidden_results":[@],"duplicate_results":[]}]}])")},
      {made<CZZLKRankerFeedback>([](auto& f) {
         f.rankerTimeout = true;
         f.rankerResults = {fullResult()};
       }),
       7, true,
       withResult(R"("blending_duration":null,"sections":[],"ranker_did_rank":false,)"
                  R"("ranker_timeout":true,"ranker_results":[@],"ranker_duration":null)")},
      {made<HVCardSectionEngagementFeedback>([](auto& f) {
         f.triggerEvent = 2;
         f.cardType = 4;
         f.actionTarget = 23;
         f.actionDestination = "d";
       }),
       10, true,
       R"("trigger_event":"tap","card_type":"hosted_html_page","action_target":"episode",)"
       R"("action_destination":"d")"},
      {made<HVMapsCardSectionEngagementFeedback>([](auto& f) { f.feedbackType = 201; }), 10, true,
       R"("trigger_event":"tap","card_type":"maps","action_target":"postal_address")"},
      {made<HVMapsCardSectionEngagementFeedback>([](auto& f) { f.feedbackType = 222; }), 10, true,
       R"("trigger_event":"tap","card_type":"maps","action_target":null)"},
      {made<HVStoreCardSectionEngagementFeedback>([](auto& f) { f.productPageResult = 4; }), 10,
       true,
       R"("trigger_event":"tap","card_type":"tunevo_sheet","action_target":"user_purchased_item")"},
      {made<HVErrorFeedback>([](auto& f) {
         f.error = errorRecordOf(zelkorError(500, "why"));
         f.underlyingError = HVError{-3, std::nullopt, std::nullopt};
       }),
       11, true,
       R"("error":{"code":500,"domain":"ZLKErrorDomain","reason":"why"},)"
       R"("underlying_error":{"code":-3,"domain":null,"reason":null})"},
      {made<HVErrorFeedback>(), 11, true, R"("error":null,"underlying_error":null)"},
      {made<HVSuggestionEngagementFeedback>([](auto& f) { f.suggestion = suggestion("x"); }), 12,
       true, R"("id":"s")"},
      {made<HVSuggestionEngagementFeedback>(), 12, true, R"("id":null)"},
      {made<HVCardViewDisappearFeedback>([](auto& f) { f.triggerEvent = 6; }), 13, true,
       R"("trigger_event":"unknown")"},
      {made<HVStartSearchFeedback>([](auto& f) { f.triggerEvent = 19; }), 14, true,
       R"("trigger_event":"warm","input":null,"uuid":null)"},
      {made<HVEndSearchFeedback>([](auto& f) { f.uuid = "U"; }), 15, true, R"("uuid":"U")"},
      {made<HVVisibleSuggestionsFeedback>([](auto& f) {
         f.suggestions = {suggestion(std::nullopt), suggestion("own")};
         f.suggestionQuery = "q";
       }),
       16, true,
       R"("suggestions":[{"id":"s","suggestion":"snow","score":2,"suggestion_type":"recents"},)"
       R"({"id":"s","suggestion":"snow","score":2,"suggestion_type":"recents","fbr":"own"}],)"
       R"("suggestion_query":"q")"},
      {made<HVResultsReceivedAfterTimeoutFeedback>([](auto& f) { f.results = {fullResult()}; }), 22,
       true, withResult(R"("results":[@])")},
      {made<HVLateSectionsAppendedFeedback>([](auto& f) { f.sections = {section()}; }), 23, true,
       withResult(R"("sections":[{"id":"sec","score":1.5,"bundle_id":null,"results":[@]}])")},
      {made<HVClearInputFeedback>([](auto& f) { f.triggerEvent = 3; }), 24, true,
       R"("trigger_event":"backspace")"},
      {std::make_shared<ZelkorSessionEndFeedback>(6), 25, false,
       R"("reason":"engagement received")"},
      {std::make_shared<ZLKSkipSearchFeedback>(6, "a://"), 26, true,
       R"("trigger_event":"query_input_with_uri_scheme_prefix","input":"a://")"},
      {std::make_shared<ZLKCacheHitFeedback>(4, "snow", "U"), 26, true,
       R"("trigger_event":"cache_hit","input":"snow","uuid":"U")"},
      {made<HVSectionEngagementFeedback>([](auto& f) {
         f.identifier = "i";
         f.triggerEvent = 3;
         f.section = section();
       }),
       27, true, R"("id":"i","trigger_event":"show_less")"},
      {made<HVVisibleSectionHeaderFeedback>([](auto& f) {
         f.headerType = 3;
         f.section = section();
       }),
       28, true, R"("section_id":null,"section_header_type":"normal")"},
      {made<ZelkorSessionMissingResults>([](auto& f) { f.results = {fullResult()}; }), 29, false,
       withResult(R"("results":[@])")},
      {made<ZelkorSessionMissingSuggestions>(), 30, false, R"("suggestions":[])"},
      {made<HVDidGoToSiteFeedback>([](auto& f) { f.input = "i"; }), 31, true, R"("input":"i")"},
      {made<ZelkorConnectionInvalidated>(), 32, false, ""},
      {made<HVResultGradingFeedback>([](auto& f) {
         f.grade = 5;
         f.textFeedback = "unsent";
       }),
       33, false, R"("grade":"excellent","result":null)"},
      {made<HVResultGradingFeedback>([](auto& f) {
         f.family = FeedbackFamily::Message;
         f.result = fullResult();
         f.textFeedback = "good";
       }),
       33, false, withResult(R"("grade":"unknown","result":@,"text_feedback":"good")")},
      {made<HVDidGoToSearchFeedback>([](auto& f) { f.endpointType = 12; }), 34, true,
       R"("input":null,"endpoint_type":"zelkor_warm")"},
  };
}

class FeedbackEncodingTest : public testing::Test {
 protected:
  std::string members(const HVFeedback& feedback) {
    std::string text;
    EXPECT_TRUE(appendMembers(feedback, errors_, 0, text));
    return text;
  }
  std::string custom(std::string json) {
    HVCustomFeedback feedback;
    feedback.jsonFeedback = std::move(json);
    return members(feedback);
  }

  RecordingLog log_;
  const Logger errors_{log_, "Zelkor_Feedback_Errors"};
};

TEST_F(FeedbackEncodingTest, EveryKindHasItsTypeAndItsKeys) {
  std::set<FeedbackKind> kinds = {kKindOf<HVResultEngagementFeedback>, kKindOf<HVCustomFeedback>};
  for (const auto& row : rows()) {
    SCOPED_TRACE(row.feedback->className());
    EXPECT_EQ(row.feedback->type(), row.type);
    EXPECT_EQ(row.feedback->requiresQueryId(), row.needsQueryId);
    EXPECT_EQ(members(*row.feedback), row.members);
    EXPECT_EQ(json::value(dictionaryOf(*row.feedback, errors_)),
              *parseJson("{" + row.members + "}"));
    kinds.insert(row.feedback->kind());
  }
  EXPECT_EQ(kinds.size(), FeedbackKinds::kSize);
  EXPECT_TRUE(log_.entries().empty());
}

TEST_F(FeedbackEncodingTest, BothFamiliesOfAKindAreSentAlike) {
  for (const auto& row : rows()) {
    if (row.feedback->kind() == kKindOf<HVResultGradingFeedback>) continue;
    SCOPED_TRACE(row.feedback->className());
    const auto message = row.feedback->clone();
    message->family = FeedbackFamily::Message;
    EXPECT_EQ(members(*message), row.members);
    EXPECT_EQ(message->type(), row.type);
  }
}

TEST_F(FeedbackEncodingTest, AnEngagementTellsWhereItLed) {
  struct Case {
    const char* name;
    std::function<void(HVResultEngagementFeedback&)> fill;
    std::string rest;  // after trigger and destination
  };
  const auto with = [](std::int32_t type, const auto& change) {
    return [type, change](HVResultEngagementFeedback& f) {
      f.result = fullResult(type);
      change(f);
    };
  };
  const auto nothing = [](HVResultEngagementFeedback&) {};
  const std::vector<Case> cases = {
      {"no result",
       [](auto& f) {
         f.actionEngaged = true;
         f.actionTarget = 6;
       },
       R"("result":null)"},
      {"a result of the service", with(1, nothing),
       R"("result":{"id":"r","action_destination":"https://p.example/"})"},
      {"its action",
       with(1,
            [](auto& f) {
              f.actionEngaged = true;
              f.actionTarget = 6;
            }),
       R"("result":{"id":"r","action_destination":"tel:1"},"action_target":"open")"},
      {"no address",
       with(1, [](auto& f) { changeResult(f, [](auto& r) { r.punchout->urls = {"x"}; }); }),
       R"("result":{"id":"r","action_destination":null})"},
      {"no action, though engaged",
       with(1,
            [](auto& f) {
              changeResult(f, [](auto& r) { r.action.reset(); });
              f.actionEngaged = true;
            }),
       R"("result":{"id":"r","action_destination":null},"action_target":"unknown")"},
      {"a local result", with(2, nothing),
       R"("result":{"id":"r","action_destination":"non_zelkor_result"})"},
      {"another engine's", with(11, nothing),
       R"("result":{"id":"r","third_party_suggestion":"Title",)"
       R"("action_destination":"non_zelkor_result"})"},
      {"a title without a text",
       with(14, [](auto& f) { changeResult(f, [](auto& r) { r.title.reset(); }); }),
       R"("result":{"id":"r","third_party_suggestion":null,)"
       R"("action_destination":"non_zelkor_result"})"},
      {"no title",
       with(9,
            [](auto& f) {
              changeResult(f, [](auto& r) {
                r.title.reset();
                r.hasTitle = false;
              });
            }),
       R"("result":{"id":"r","action_destination":"non_zelkor_result"})"},
  };
  for (const auto& wanted : cases) {
    SCOPED_TRACE(wanted.name);
    HVResultEngagementFeedback feedback;
    feedback.triggerEvent = 13;
    feedback.destination = 10;
    wanted.fill(feedback);
    EXPECT_EQ(feedback.type(), 8u);
    EXPECT_EQ(
        members(feedback),
        R"("trigger_event":"shortcut","destination":"more_locations_in_maps",)" + wanted.rest);
  }
}

TEST_F(FeedbackEncodingTest, CustomFeedbackPassesThroughUntouched) {
  EXPECT_EQ(custom(R"({"b": 1.0, "a":[ ]})"), R"("b": 1.0, "a":[ ])");
  EXPECT_EQ(custom(" {\n} "), "");
  HVCustomFeedback named;
  named.jsonFeedback = R"({"type":"mine","a":1})";
  constexpr std::string_view kSet[] = {"type"};
  std::string text = R"({"x":1)";
  EXPECT_TRUE(appendMembers(named, errors_, 1, text, kSet));
  EXPECT_EQ(text, R"({"x":1,"a":1)");
  EXPECT_EQ(custom(R"({"type":"mine","n":0.1e1,"n":2})"), R"("type":"mine","n":0.1e1,"n":2)");
  const std::pair<std::int32_t, std::pair<std::uint32_t, bool>> types[] = {
      {0, {17, true}}, {1, {19, true}}, {2, {18, true}}, {3, {20, false}}};
  for (const auto& [customType, expected] : types) {
    HVCustomFeedback feedback;
    feedback.feedbackType = customType;
    EXPECT_EQ(feedback.type(), expected.first);
    EXPECT_EQ(feedback.requiresQueryId(), expected.second);
  }
}

TEST_F(FeedbackEncodingTest, DeepCustomFeedbackIsStillADictionary) {
  HVCustomFeedback feedback;
  feedback.jsonFeedback = R"({"a":)" + std::string(511, '[') + std::string(511, ']') + "}";
  EXPECT_EQ(dictionaryOf(feedback, errors_).size(), 1u);
}

TEST_F(FeedbackEncodingTest, WhatJsonCannotExpressLeavesTheTextAsItWas) {
  const auto refused = [this](const HVFeedback& feedback) {
    std::string text = "before";
    EXPECT_FALSE(appendMembers(feedback, errors_, 0, text));
    EXPECT_EQ(text, "before");
    EXPECT_TRUE(dictionaryOf(feedback, errors_).empty());
  };
  for (const double odd : {std::nan(""), std::numeric_limits<double>::infinity()}) {
    HVVisibleResultsFeedback visible;
    HVSearchResult result;
    result.score = odd;
    visible.results = {{}, result, {}};
    refused(visible);
  }
  const std::string broken = "eight bytes and \xC3";
  HVStartNetworkSearchFeedback start;
  start.headers = {{"a", broken}, {"b", "c"}};
  refused(start);
  start.headers = {{broken, "a"}};
  refused(start);
  HVResultEngagementFeedback engagement;
  engagement.result = fullResult();
  changeResult(engagement, [&](auto& r) { r.punchout->urls = {"tel:" + broken}; });
  refused(engagement);
  engagement.result = fullResult();
  changeResult(engagement, [&](auto& r) { r.identifier = broken; });
  refused(engagement);
  for (const auto* json : {"", "[]", "7", "{", "{}{}", "\"x\"", "{\"a\":\"\xFF\"}"}) {
    HVCustomFeedback feedback;
    feedback.jsonFeedback = json;
    refused(feedback);
  }
}

TEST_F(FeedbackEncodingTest, EmbeddedTextsCountAsNothingWhenTheyAreNoJson) {
  for (const auto* text : {"", "{", "nul", "{\"a\":\"\xFF\"}"}) {
    std::string written;
    EXPECT_TRUE(appendJson(JsonText(text), written));
    EXPECT_EQ(written, "null") << text;
  }
  for (const auto& [text, wanted] :
       {std::pair("[]", "null"), {" \"{}\"", "null"}, {"", "null"}, {"\n{ }\n", "{ }"}}) {
    HVEndNetworkSearchFeedback end;
    end.networkTimingData = JsonText(text);
    EXPECT_THAT(members(end), testing::HasSubstr(std::string(R"("network_timing_data":)") + wanted +
                                                 R"(,"connection_reused")"));
  }
}

struct UnencodedFeedback final : HVFeedback {
  FeedbackKind kind() const override { return static_cast<FeedbackKind>(FeedbackKinds::kSize); }
  std::string_view className() const override { return "HVStrangeFeedback"; }
  std::unique_ptr<HVFeedback> clone() const override { return nullptr; }
  void appendTo(std::string&) const override {}
  std::size_t messageSize() const override { return 0; }
  bool read(RecordReader&) override { return false; }
};

TEST_F(FeedbackEncodingTest, AKindWithoutAnEncoderIsNoticed) {
  UnencodedFeedback feedback;
  EXPECT_EQ(members(feedback), "");
  EXPECT_TRUE(log_.entries().empty());  // only a message's is an error
  feedback.family = FeedbackFamily::Message;
  EXPECT_EQ(members(feedback), "");
  EXPECT_EQ(feedback.type(), 21u);
  EXPECT_TRUE(feedback.requiresQueryId());
  const std::vector<RecordingLog::Entry> expected = {
      {LogLevel::Error, "Zelkor_Feedback_Errors",
       "Feedback dictionary translation for HVStrangeFeedback fell back to default "
       "implementation."}};
  EXPECT_EQ(log_.entries(), expected);
}

TEST_F(FeedbackEncodingTest, TextsAndNumbersReadBackAsTheyWere) {
  std::mt19937_64 random(7);
  for (int i = 0; i < 2000; ++i) {
    std::string text;
    for (std::size_t length = random() % 40; length > 0; --length) {
      text += static_cast<char>(random() % 4 == 0 ? random() % 128 : 'a' + random() % 26);
      if (random() % 64 == 0) text += "\xE2\x82\xAC";
    }
    std::string written;
    EXPECT_TRUE(appendJsonString(text, written));
    EXPECT_EQ(written, json::serialize(json::value(text)));
    const auto number = std::bit_cast<double>(random());
    written.clear();
    if (!appendJsonNumber(number, written)) continue;
    EXPECT_TRUE(isJson(written)) << written;
    EXPECT_EQ(std::strtod(written.c_str(), nullptr), number) << written;
  }
  const std::string quotes(1'000'000, '"');
  std::string written;
  appendJsonString(quotes, written);
  EXPECT_EQ(written.size(), 2 * quotes.size() + 2);
}

struct RecordingProcessor final : IdentifierProcessor {
  std::vector<std::string> seen;

  std::string replacementForIdentifier(const std::string& identifier) override {
    return "new " + identifier;
  }
  void identifierReferencedForResult(const std::string& identifier,
                                     const HVSearchResult& result) override {
    seen.push_back("result " + identifier + " is " + *result.identifier);
  }
  void identifierReferencedForSuggestion(const std::string& identifier,
                                         const HVSuggestion& item) override {
    seen.push_back("suggestion " + identifier + " is " + *item.identifier);
  }
  void identifierExpanded(const std::string& identifier) override { seen.push_back(identifier); }
};

TEST_F(FeedbackEncodingTest, IdentifiersAreReplacedInACopyAndReported) {
  std::map<FeedbackKind, std::vector<std::string>> expected = {
      {kKindOf<HVVisibleResultsFeedback>, {"r"}},
      {kKindOf<HVRankingFeedback>, {"r"}},
      {kKindOf<CZZLKRankerFeedback>, {"r"}},
      {kKindOf<HVSuggestionEngagementFeedback>, {"suggestion s is new s"}},
      {kKindOf<HVVisibleSuggestionsFeedback>, {"s", "s"}},
      {kKindOf<HVResultsReceivedAfterTimeoutFeedback>, {"r"}},
      {kKindOf<HVLateSectionsAppendedFeedback>, {"r"}},
      {kKindOf<HVResultGradingFeedback>, {"r"}},
  };
  for (const auto& row : rows()) {
    SCOPED_TRACE(row.feedback->className());
    if (row.members.find(R"("id":)") == std::string::npos) continue;
    if (row.feedback->kind() == kKindOf<ZelkorSessionMissingResults>) continue;
    RecordingProcessor processor;
    const auto prepared = processed(row.feedback, processor);
    const auto text = members(*prepared);
    if (row.members != R"("id":null)") {
      EXPECT_EQ(processor.seen, expected[row.feedback->kind()]);
    }
    EXPECT_EQ(text.find(R"("id":"r")"), std::string::npos);
    EXPECT_EQ(text.find(R"("id":"s")"), std::string::npos);
    EXPECT_EQ(members(*row.feedback), row.members);  // the record itself is as it was
  }
  RecordingProcessor processor;
  auto engagement = made<HVResultEngagementFeedback>([](auto& f) { f.result = fullResult(); });
  EXPECT_NE(processed(engagement, processor), engagement);
  EXPECT_THAT(processor.seen, testing::ElementsAre("result r is new r"));
  const std::shared_ptr<HVFeedback> withoutIdentifiers[] = {
      made<HVClearInputFeedback>(), made<HVVisibleResultsFeedback>(),
      made<HVSuggestionEngagementFeedback>(),
      made<HVResultGradingFeedback>([](auto& f) { f.result = HVSearchResult{.identifier = ""}; })};
  for (const auto& plain : withoutIdentifiers) EXPECT_EQ(processed(plain, processor), plain);
  EXPECT_EQ(processor.seen.size(), 1u);
}

TEST_F(FeedbackEncodingTest, PropertiesOfARecordAreTexts) {
  ZLKSkipSearchFeedback skip(1, "text");
  const auto properties = dictionaryWithPropertiesOfObject(skip);
  EXPECT_EQ(json::serialize(properties),
            R"({"trigger_event":"less_than_minimum_query_length","input":"text"})");
  EXPECT_EQ(dictionaryWithPropertiesOfObject(HVError{})["reason"], "");
}

}  // namespace
}  // namespace zelkord
