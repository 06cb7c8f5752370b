#include <gtest/gtest.h>

#include <array>
#include <random>

#include "base/Json.h"
#include "zelkord/encoding/ObjectMembers.h"

namespace zelkord {
namespace {

constexpr std::array<std::string_view, 2> kNames = {"type", "timestamp"};

std::string membersLeft(std::string_view object) {
  std::string text = "{";
  appendMembersOfObject(object, kNames, text.size(), text);
  return text + "}";
}

TEST(ObjectMembersTest, WhatIsLeftKeepsItsBytes) {
  const std::pair<const char*, const char*> cases[] = {
      {R"( { } )", "{}"},
      {R"({"type":1})", "{}"},
      {R"({ "a" : 1.50 , "type" : {"a":[1,"}"]} , "b":"," })", R"({"a" : 1.50,"b":","})"},
      {R"({"type":1,"type":2,"t\u0079pe":3,"\"type":4,"Type":5})", R"({"\"type":4,"Type":5})"},
      {R"({"a":{"type":1},"b":["type",2]})", R"({"a":{"type":1},"b":["type",2]})"},
      {R"({"\\":"\\","timestamp":"\"","c":null})", R"({"\\":"\\","c":null})"},
  };
  for (const auto& [object, wanted] : cases) EXPECT_EQ(membersLeft(object), wanted);
}

class RandomJson {
 public:
  // Members of any kind, their texts full of what could be taken for an object's own marks.
  std::string object(int depth) {
    std::string text = "{";
    for (auto left = random_() % 5; left > 0; --left) {
      text += _space() + _string() + _space() + ":" + _value(depth) + (left > 1 ? "," : "");
    }
    return text + _space() + "}";
  }

 private:
  template <std::size_t Count>
  std::string _oneOf(const char* const (&texts)[Count]) {
    return texts[random_() % Count];
  }
  std::string _space() { return _oneOf({"", "", " ", "\n\t"}); }
  std::string _string() {
    return _oneOf({R"("type")", R"("t\u0079pe")", R"("timestamp")", R"("\\")", R"("\"")", R"(",")",
                   R"("}")", R"("]{:")", R"("type\\")", R"("\\\"type")", R"("")"});
  }
  std::string _value(int depth) {
    if (depth == 0) return _space() + _oneOf({"1e3", "null", "-0.5"});
    switch (random_() % 3) {
      case 0:
        return _string() + _space();
      case 1:
        return "[" + _value(depth - 1) + "," + _value(depth - 1) + "]";
      default:
        return object(depth - 1) + _space();
    }
  }

  std::mt19937_64 random_{11};
};

TEST(ObjectMembersTest, ItIsTheSameAsErasingTheMembersOfTheValue) {
  RandomJson random;
  for (int i = 0; i < 5'000; ++i) {
    const auto text = random.object(4);
    auto wanted = parseJson(text);
    ASSERT_TRUE(wanted) << text;
    for (const auto name : kNames) wanted->get_object().erase(name);
    EXPECT_EQ(parseJson(membersLeft(text)), wanted) << text;
  }
}

}  // namespace
}  // namespace zelkord
