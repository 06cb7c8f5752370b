#include <gtest/gtest.h>

#include "zelkorctl/AnswerText.h"
#include "zelkorctl/LineEditor.h"
#include "zelkorctl/Printable.h"

namespace zelkorctl {
namespace {

using Lines = std::vector<std::string>;

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
      {"[]", {}},
      {R"({"results":[]})", {"  (14 bytes that are no list of result sets)"}},
      {"<html>", {"  (6 bytes that are no list of result sets)"}},
      {R"([{"results":[{"title":"1"},{"title":"2"},{"title":"3"},{"title":"4"}]}])",
       {"  1", "  2", "  3"}},
  };
  for (const auto& [data, lines] : cases) {
    SCOPED_TRACE(data);
    EXPECT_EQ(resultLines(data, 3, 80), lines);
  }
  const std::string wide = R"([{"results":[{"title":")" + std::string(300, 'w') + R"("}]}])";
  EXPECT_EQ(displayWidth(resultLines(wide, 3, 80).front()), 42u);
}

TEST(OutcomeJsonTest, EmbedsTheResponseWhenItIsJson) {
  Outcome outcome{"a", Outcome::Kind::Answered, 1.5, {}};
  outcome.answer.queryId = 4;
  outcome.answer.reply.emplace().data = Data("[1]");
  EXPECT_EQ(outcomeJson(outcome).at("reply").at("data"), parseJson("[1]"));
  outcome.answer.reply->data = Data("\xff");
  EXPECT_EQ(outcomeJson(outcome).at("reply").at("text"), "\\xff");
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
