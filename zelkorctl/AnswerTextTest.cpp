#include <gtest/gtest.h>

#include "zelkorctl/AnswerText.h"
#include "zelkorctl/BagFetch.h"
#include "zelkorctl/FollowUps.h"
#include "zelkorctl/LineEditor.h"
#include "zelkorctl/Printable.h"

namespace zelkorctl {
namespace {

using Lines = std::vector<std::string>;

ClientAnswer answerWithData(std::string_view data) {
  ClientAnswer answer;
  answer.reply.emplace().data = Data(std::string(data));
  return answer;
}

TEST(PrintableTest, LetsNothingSteerTheTerminal) {
  const std::pair<std::string, std::string> cases[] = {
      {"größe 漢字 👍", "größe 漢字 👍"},
      {"\x1b]0;x\x07", "\\x1b]0;x\\x07"},
      {"a\nb\tc\\", "a\\nb\\tc\\\\"},
      {"\xc2\x9b"
       "31m",
       "\\u009b31m"},
      {"\xe2\x80\xae"
       "gpj.exe",
       "\\u202egpj.exe"},
      {"\xff\xc3", "\\xff\\xc3"},
      {std::string("a\0b", 3), "a\\x00b"},
  };
  for (const auto& [text, expected] : cases) EXPECT_EQ(printable(text), expected);
}

TEST(PrintableTest, CountsColumnsAndNotBytes) {
  EXPECT_EQ(displayWidth("e\xcc\x81漢"), 3u);
  EXPECT_EQ(fitted("漢字漢字", 5), "漢字…");
  EXPECT_EQ(fitted("abc", 0), "");
  EXPECT_EQ(padded("漢", 4), "漢  ");
}

TEST(ResultLinesTest, AlignsTheBestResultsAndSurvivesAnything) {
  const struct {
    const char* data;
    Lines lines;
  } cases[] = {
      {R"([{"query":"a","results":[{"title":"Ab","type":"web","description":"first"},
          {"title":"Longer","description":"second"}]},{"results":[{"title":"3"}]}])",
       {"  Ab      web  first", "  Longer       second", "  3"}},
      {R"([{"results":[{"title":"x\u001b[2J","description":"\n"}]}])", {"  x\\x1b[2J    \\n"}},
      {R"([{"results":[7,{"title":{"text":"no"}},{"title":"yes"}]},8,{"results":9}])",
       {"", "  yes"}},
      {R"([{"query":"friend","results":[{"title":"friend"}]},
          {"query":"France","results":[{"title":"France"}]}])",
       {"  France"}},
      {"[]", {}},
      {R"({"results":[]})", {"  (14 bytes that are no list of result sets)"}},
      {"<html>", {"  (6 bytes that are no list of result sets)"}},
      {R"([{"results":[{"title":"1"},{"title":"2"},{"title":"3"},{"title":"4"}]}])",
       {"  1", "  2", "  3"}},
  };
  for (const auto& [data, lines] : cases) {
    SCOPED_TRACE(data);
    EXPECT_EQ(resultLines(answerWithData(data), {3, 80, "Fra"}), lines);
  }
  const std::string wide = R"([{"results":[{"title":")" + std::string(300, 'w') + R"("}]}])";
  EXPECT_EQ(displayWidth(resultLines(answerWithData(wide), {3, 80}).front()), 42u);
}

TEST(CardLinesTest, AlignsTheFactsAndSurvivesAnything) {
  const struct {
    const char* data;
    Lines lines;
  } cases[] = {
      {R"([{"title":"France","sections":[{"title":"France","subtitle":"Country"},
          {"rows":[{"label":"Code","value":"FR"},{"label":"Number","value":"250"}]}]}])",
       {"  France", "  Country", "    Code    FR", "    Number  250"}},
      {R"([{"title":"\u001b[2J","sections":[7,{"rows":[8,{"label":9}]}]},"x"])",
       {"  \\x1b[2J", ""}},
      {R"({"title":"France"})", {"  (18 bytes that are no list of cards)"}},
  };
  for (const auto& [data, lines] : cases) {
    SCOPED_TRACE(data);
    EXPECT_EQ(cardLines(data, 40), lines);
  }
}

TEST(FollowUpsTest, FindWhereAResponseLeads) {
  const struct {
    const char* data;
    std::optional<std::string> more;
    std::optional<std::string> second;  // the second result's card
  } cases[] = {
      {R"([{"results":[{"card_url":"a"}]},{"more_results_url":"m","results":[{"card_url":"b"}]}])",
       "m", "b"},
      {R"([{"query":"friend","more_results_url":"n","results":[{},{"card_url":"x"}]},
          {"query":"france","more_results_url":"m","results":[{},{"card_url":"b"}]}])",
       "m", "b"},
      {R"([7,{"more_results_url":8,"results":[{},9,{"card_url":"b"}]}])", {}, "b"},
      {R"([{"results":[{"card_url":"a"},{"title":"b"}]}])", {}, {}},
      {"{}", {}, {}},
      {"<", {}, {}},
  };
  for (const auto& [data, more, second] : cases) {
    SCOPED_TRACE(data);
    EXPECT_EQ(moreResultsURL(answerWithData(data), "Fra"), more);
    EXPECT_EQ(cardURL(answerWithData(data), "Fra", 2), second);
  }
}

TEST(OutcomeJsonTest, TellsTheSourceAndTheExchangeOnlyWhenAsked) {
  Outcome outcome;
  EXPECT_EQ(sourceOf(outcome), "");
  outcome.answer.reply.emplace();
  EXPECT_EQ(sourceOf(outcome), "cache");
  outcome.answer.reply->httpResponse.emplace().status = 200;
  const auto brief = outcomeJson(outcome, Exchange::LeftOut);
  EXPECT_EQ(brief.at("source"), "network");
  EXPECT_FALSE(brief.at("reply").as_object().contains("httpResponse"));
  const auto full = outcomeJson(outcome, Exchange::Told);
  EXPECT_EQ(full.at("reply").at("httpResponse").at("status"), 200);
}

TEST(OutcomeJsonTest, EmbedsTheResponseWhenItIsJson) {
  Outcome outcome{"a", Outcome::Kind::Answered, 1.5, {}, {}, QueryKind::Search};
  outcome.answer.queryId = 4;
  outcome.answer.reply.emplace().data = Data("[1]");
  EXPECT_EQ(outcomeJson(outcome, Exchange::LeftOut).at("reply").at("data"), parseJson("[1]"));
  outcome.answer.reply->data = Data("\xff");
  EXPECT_EQ(outcomeJson(outcome, Exchange::LeftOut).at("reply").at("text"), "\\xff");
}

TEST(OutcomeJsonTest, HasTheSetsForTheTextBesideTheWholeResponse) {
  Outcome outcome{"Fra", Outcome::Kind::Answered, 1, {}, {}, QueryKind::Search};
  outcome.answer.reply.emplace().data = Data(R"([{"query":"friend"},{"query":"france"}])");
  const auto object = outcomeJson(outcome, Exchange::LeftOut);
  EXPECT_EQ(object.at("sets"), parseJson(R"([{"query":"france"}])"));
  EXPECT_EQ(object.at("reply").at("data").as_array().size(), 2u);
}

TEST(BagFetchTest, SaysWhyThereIsNoBag) {
  constexpr double kNow = 1'000'000;
  const struct {
    const char* bag;
    const char* text;
  } cases[] = {
      {R"({"url":"https://a/bag","last_failure":{"time":999998,"reason":"connection\nrefused"},
           "next_attempt":1000030.4})",
       "fetching https://a/bag failed 2 s ago: connection\\nrefused; next attempt in 30 s"},
      {R"({"url":null,"last_failure":{"time":992000,"reason":"r"},"next_attempt":null})",
       "fetching it failed 2 h 13 min ago: r"},
      {R"({"url":"u","last_failure":{"reason":7},"next_attempt":999999})",
       "fetching u failed; the next query tries again"},
      {R"({"url":"u","last_failure":null,"next_attempt":1000300})",
       "fetching u has not come to an end; next attempt in 5 min"},
      {R"({"version":"4"})", "fetching it has not come to an end"},
  };
  for (const auto& [bag, text] : cases) {
    SCOPED_TRACE(bag);
    EXPECT_EQ(bagFetchText(parseJson(bag)->as_object(), kNow), text);
  }
}

TEST(LineEditorTest, FollowsTheKeys) {
  using Event = LineEditor::Event;
  const struct {
    std::string keys;
    std::string text;
    Event last;
  } cases[] = {
      {"abc", "abc", Event::Changed},
      {"ab\x7f", "a", Event::Changed},
      {"aö\x7f", "a", Event::Changed},
      {"\x7f", "", Event::None},
      {"\xc3", "", Event::None},
      {"\xc3"
       "a",
       "a", Event::Changed},
      {"\xff\xff"
       "b",
       "b", Event::Changed},
      {"a\x1b[1;5Cb", "ab", Event::Changed},
      {"a\x15", "", Event::Changed},
      {"a\n", "", Event::Submitted},
      {"a\x04", "a", Event::Ended},
  };
  for (const auto& [keys, text, last] : cases) {
    SCOPED_TRACE(printable(keys));
    LineEditor editor;
    auto event = Event::None;
    for (const char key : keys) event = editor.take(key);
    EXPECT_EQ(editor.text(), text);
    EXPECT_EQ(event, last);
  }
}

}  // namespace
}  // namespace zelkorctl
