#include <gtest/gtest.h>

#include "corezelkor/client/Results.h"

namespace zelkor {
namespace {

ClientAnswer answerOf(std::string_view data) {
  ClientAnswer answer;
  answer.reply.emplace().data = Data(std::string(data));
  return answer;
}

// The "query" of each set, joined.
std::string queriesFor(std::string_view typed, const ClientAnswer& answer) {
  const auto sets = resultsFor(typed, answer);
  if (!sets) return "none";
  std::string queries;
  for (const auto& set : *sets) {
    queries += stringIn(set.get_object(), "query").value_or("?") + " ";
  }
  return queries;
}

TEST(ResultsTest, AreThoseForWhatIsTyped) {
  // What "f" was answered with, and what a service may send besides.
  const auto* kCached =
      R"([{"query":"friend"},{"query":"France"},{"results":[]},7,{"query":"fr"},{"query":9},
          {"query":"größe"},{"query":"frï"}])";
  const struct {
    const char* typed;
    const char* queries;
  } cases[] = {
      {"fr", "friend France fr frï "},
      {"fra", "France "},
      {"FRANCE", "France "},
      {"frÏ", "frï "},
      {"GRÖ", "größe "},
      // Nothing goes on from it: the service has answered another text for this one.
      {"frnace", "friend France ? fr ? größe frï "},
      {"", "friend France ? fr ? größe frï "},
  };
  for (const auto& [typed, queries] : cases) {
    SCOPED_TRACE(typed);
    EXPECT_EQ(queriesFor(typed, answerOf(kCached)), queries);
  }
  EXPECT_EQ(queriesFor("a\xEF\xBF\xBF", answerOf(R"([{"query":"b"},{"query":"a�c"}])")), "a�c ");
}

TEST(ResultsTest, OfTheServicesOwnResponseAreAll) {
  auto answer = answerOf(R"([{"query":"france"},{"query":"frank"}])");
  EXPECT_EQ(queriesFor("fran", answer), "france frank ");
  EXPECT_EQ(queriesFor("franc", answer), "france ");
  answer.reply->httpResponse.emplace().status = 200;
  EXPECT_EQ(queriesFor("franc", answer), "france frank ");
}

TEST(ResultsTest, AreNothingWithoutAList) {
  EXPECT_EQ(queriesFor("a", ClientAnswer()), "none");
  for (const auto* data : {"", "<html>", R"({"query":"a"})"}) {
    EXPECT_EQ(queriesFor("a", answerOf(data)), "none") << data;
  }
}

}  // namespace
}  // namespace zelkor
