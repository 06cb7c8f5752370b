#include <gtest/gtest.h>

#include <boost/json/parse.hpp>

#include "sandbox/service/Misbehaviour.h"

namespace sandbox {

namespace {

Misbehaviour ruleOf(const char* text) { return *parseMisbehaviour(boost::json::parse(text)); }

}  // namespace

TEST(MisbehaviourTest, RefusesBadValuesByName) {
  for (const auto& [text, key] : std::initializer_list<std::pair<const char*, const char*>>{
           {R"({"kind":"silly"})", "kind"},
           {R"({"kind":7})", "kind"},
           {R"({"path":7})", "path"},
           {R"({"count":-1})", "count"},
           {R"({"status":1000})", "status"},
           {R"({"delay_ms":"soon"})", "delay_ms"},
           {R"({"bytes":1e12})", "bytes"},
           {R"({"headers":["a"]})", "headers"},
           {R"({"headers":{"a":1}})", "headers"},
           {R"({"path":"/search","forever":true})", "forever"}}) {
    SCOPED_TRACE(text);
    const auto rule = parseMisbehaviour(boost::json::parse(text));
    ASSERT_FALSE(rule);
    EXPECT_NE(rule.reason().find(key), std::string::npos);
  }
  EXPECT_FALSE(parseMisbehaviour(boost::json::parse("[]")));
}

TEST(MisbehaviourTest, TakesRequestsOfItsPathAsOftenAsAsked) {
  Misbehaviours rules;
  rules.add(ruleOf(R"({"path":"/search","count":2,"skip":1,"status":500})"));
  rules.add(ruleOf(R"({"path":"/image/*","count":0,"status":404})"));
  rules.add(ruleOf(R"({"path":"/search","status":503})"));
  EXPECT_FALSE(rules.take("/searching"));
  EXPECT_FALSE(rules.take("/search"));
  EXPECT_EQ(rules.take("/search")->status, 500U);
  EXPECT_EQ(rules.take("/search")->status, 500U);
  EXPECT_EQ(rules.take("/search")->status, 503U);
  EXPECT_FALSE(rules.take("/search"));
  for (int time = 0; time < 5; ++time) EXPECT_TRUE(rules.take("/image/flags/fr.png"));
  rules.clear();
  EXPECT_FALSE(rules.take("/image/flags/fr.png"));
}

TEST(MisbehaviourTest, SaysWhetherItTakesThePlaceOfTheAnswer) {
  struct Case {
    const char* rule;
    bool replaces;
    unsigned status;
    std::size_t bodySize;
  };
  for (const auto& [text, replaces, status, bodySize] :
       std::initializer_list<Case>{{R"({"delay_ms":5})", false, 0, 0},
                                   {R"({"kind":"truncated"})", false, 0, 0},
                                   {R"({"kind":"slow","headers":{"A":"b"}})", false, 0, 0},
                                   {R"({"status":503})", true, 503, 0},
                                   {R"({"body":"{"})", true, 200, 1},
                                   {R"({"kind":"truncated","body":"[1,2]"})", true, 200, 5},
                                   {R"({"kind":"big","bytes":1000,"status":206})", true, 206, 1000},
                                   {R"({"kind":"deep_json","depth":600})", true, 200, 1200},
                                   {R"({"kind":"redirect","location":"/x"})", true, 302, 0},
                                   {R"({"kind":"wrong_digest"})", true, 400, 42},
                                   {R"({"kind":"close"})", true, 0, 0}}) {
    SCOPED_TRACE(text);
    const auto reply = replacementFor(ruleOf(text));
    ASSERT_EQ(reply.has_value(), replaces);
    if (!reply) continue;
    EXPECT_EQ(reply->status, status);
    EXPECT_EQ(reply->bodyText().size(), bodySize);
  }
}

}  // namespace sandbox
