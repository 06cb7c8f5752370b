#include <gmock/gmock.h>

#include <cmath>

#include "platform/linux/property_list/BinaryPropertyListCheck.h"
#include "platform/linux/property_list/BinaryPropertyLists.h"

namespace zelkord {
namespace {

using testing::HasSubstr;

const BinaryPropertyLists kPlists;

// A file of hand-made objects with one-byte offsets and references; the first object is the root.
std::string plistOf(const std::vector<std::string>& objects) {
  std::string bytes = "bplist00";
  std::string table;
  for (const auto& object : objects) {
    table += static_cast<char>(bytes.size());
    bytes += object;
  }
  const auto tableAt = bytes.size();
  bytes += table;
  bytes += std::string("\0\0\0\0\0\0\1\1", 8);
  bytes += std::string(7, '\0') + static_cast<char>(objects.size());
  bytes += std::string(8, '\0');
  bytes += std::string(7, '\0') + static_cast<char>(tableAt);
  return bytes;
}

// `depth` arrays, each holding the next one `times` times.
std::string nestedPlist(int depth, int times) {
  std::vector<std::string> objects;
  for (int i = 0; i + 1 < depth; ++i) {
    objects.push_back(static_cast<char>(0xA0 | times) +
                      std::string(static_cast<std::size_t>(times), static_cast<char>(i + 1)));
  }
  objects.push_back("\x09");
  return plistOf(objects);
}

TEST(BinaryPropertyListsTest, GivesBackWhatItWrote) {
  const char* const cases[] = {
      "{}",
      R"({"a": true, "b": false, "c": "text", "": "", "ü": "日本\n"})",
      R"({"zero": 0, "one": 1, "byte": 255, "minus": -1, "low": -9223372036854775808})",
      R"({"high": 9223372036854775807, "wide": 4294967296})",
      R"({"half": 0.5, "tenth": 0.1, "whole": 3.0, "tiny": 5e-324, "huge": 1.7976931348623157e308})",
      R"({"list": [1, [2, []], {"x": {"y": []}}], "same": "text", "again": "text"})",
      R"({"z": 1, "a": 2, "m": 3})",
  };
  for (const char* text : cases) {
    SCOPED_TRACE(text);
    const auto object = parseJson(text)->as_object();
    Error error;
    const auto bytes = kPlists.encode(object, &error);
    ASSERT_TRUE(bytes) << error.description();
    const auto decoded = kPlists.decode(*bytes, &error);
    ASSERT_TRUE(decoded) << error.description();
    EXPECT_EQ(*decoded, json::value(object));
    EXPECT_EQ(json::serialize(*decoded), json::serialize(object));
  }
}

TEST(BinaryPropertyListsTest, DropsWhatItCannotHold) {
  json::object object{
      {"null", nullptr}, {"list", {1, nullptr, 2}}, {"nan", NAN}, {"inf", INFINITY}};
  object["large"] = UINT64_MAX;
  const auto decoded = kPlists.decode(*kPlists.encode(object, nullptr), nullptr);
  EXPECT_EQ(decoded, (json::value{{"list", {1, 2}}, {"large", 18446744073709551616.0}}));
}

TEST(BinaryPropertyListsTest, RefusesTextsThatWouldBeCutOff) {
  json::value deep = 1;
  for (int i = 0; i < 600; ++i) deep = json::array{deep};
  const json::object cases[] = {
      {{"a", json::string(std::string_view("x\0y", 3))}},
      {{std::string_view("x\0y", 3), 1}},
      {{"a", "\xFF"}},
      {{"a", {{{"b", "\xC3"}}}}},
      {{"deep", deep}},
  };
  for (const auto& object : cases) {
    Error error;
    EXPECT_EQ(kPlists.encode(object, &error), std::nullopt);
    EXPECT_TRUE(error.reason());
  }
}

TEST(BinaryPropertyListsTest, ReadsDatesAndData) {
  const std::string date = std::string("\x33", 1) + std::string(8, '\0');
  EXPECT_EQ(kPlists.decode(plistOf({date}), nullptr), json::value(978307200.0));
  EXPECT_EQ(kPlists.decode(plistOf({"\x44Zelk"}), nullptr), json::value("WmVsaw=="));
  EXPECT_EQ(kPlists.decode(plistOf({std::string("\x40", 1)}), nullptr), json::value(""));
}

// Every form that a written file has: texts of both kinds, also as keys and with pairs of units,
// numbers of all widths, long texts and lists, whose sizes are objects of their own.
json::object everyForm() {
  json::array many(20, json::value("\u65E5\u672C"));
  return {{"a", {1, "two", {{"b", 3.5}}, true, false}},
          {"\u00FC", "\u65E5\u672C \U0001F989"},
          {"long", std::string(300, 'x')},
          {"longer", "\u00E4 and then some more than fifteen units"},
          {"numbers", {-1, 255, 256, 65536, 4294967296, INT64_MAX, 18446744073709551615.0}},
          {"many", many},
          {"", {json::object(), json::array()}}};
}

TEST(BinaryPropertyListsTest, SurvivesEachFlippedBitAndEachCut) {
  const std::string good = *kPlists.encode(everyForm(), nullptr);
  ASSERT_EQ(kPlists.decode(good, nullptr), json::value(everyForm()));
  for (std::size_t size = 0; size < good.size(); ++size) {
    EXPECT_EQ(kPlists.decode(good.substr(0, size), nullptr), std::nullopt);
  }
  int refused = 0;
  for (std::size_t bit = 0; bit < good.size() * 8; ++bit) {
    auto bytes = good;
    bytes[bit / 8] = static_cast<char>(bytes[bit / 8] ^ 1 << bit % 8);
    Error error;
    const auto decoded = kPlists.decode(bytes, &error);
    if (!decoded) ++refused;
    EXPECT_NE(decoded.has_value(), error.reason().has_value());
  }
  EXPECT_GT(refused, 1000);
}

TEST(BinaryPropertyListCheckTest, NamesTheProblem) {
  struct Case {
    std::string bytes;
    const char* problem;
  };
  const Case cases[] = {
      {"", "trailer"},
      {"bplist00", "trailer"},
      {"{\"a\": 1}                                           ", "trailer"},
      {nestedPlist(100, 1), ""},
      {nestedPlist(19, 2), ""},
      {nestedPlist(40, 2), "too many values"},
      {plistOf({std::string("\xA1\x00", 2)}), "contains itself"},
      {plistOf({"\xA1\x01", std::string("\xA1\x00", 2)}), "contains itself"},
      {plistOf({"\xA1\x05"}), "outside"},
      {plistOf({"\x5F\x10\xFF"}), "outside"},
      {plistOf({"\x5F\x13\xFF\xFF\xFF\xFF\xFF\xFF\xFF\xFF"}), "outside"},
      {plistOf({"\xF0"}), "outside"},
      {plistOf({"\x52xy"}), ""},
      {plistOf({std::string("\x52x\0", 3)}), "broken"},
      {plistOf({"\x52x\x80"}), "broken"},
      {plistOf({std::string("\x62\xD8\x3E\xDD\x89", 5)}), ""},
      {plistOf({std::string("\x62\0x\0\0", 5)}), "broken"},
      {plistOf({std::string("\x61\xD8\x3E", 3)}), "broken"},
      {plistOf({std::string("\x62\xD8\x3E\0x", 5)}), "broken"},
      {plistOf({std::string("\x61\xDD\x89", 3)}), "broken"},
  };
  for (const auto& test : cases) {
    const auto problem = checkBinaryPropertyList(test.bytes);
    if (*test.problem == '\0') {
      EXPECT_EQ(problem, "");
    } else {
      EXPECT_THAT(problem, HasSubstr(test.problem));
    }
  }
  EXPECT_THAT(checkBinaryPropertyList(nestedPlist(100, 1), {.depth = 99}), HasSubstr("too deep"));
  const auto shared = plistOf({"\xA3\1\1\1", "\x44Zelk"});
  EXPECT_EQ(checkBinaryPropertyList(shared, {.bytes = 12}), "");
  EXPECT_THAT(checkBinaryPropertyList(shared, {.bytes = 11}), HasSubstr("too many bytes"));
}

}  // namespace
}  // namespace zelkord
