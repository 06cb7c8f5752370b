#include <gtest/gtest.h>

#include "platform/api/SettingsStore.h"
#include "platform/testing/FakeSettings.h"

namespace zelkord {
namespace {

TEST(KnownSettingsTest, RefusesWhatNobodyWouldRead) {
  struct Case {
    std::string_view key;
    const char* value;  // JSON; null: the key is to go
    std::string_view refusal;
  };
  constexpr std::string_view kUnknown = "the daemon reads no such setting";
  constexpr std::string_view kKind = "this setting's value is of the kind: ";
  const std::pair<std::string_view, std::vector<Case>> kinds[] = {
      {"", {{"ZLKNoSuch", "true", kUnknown}, {"zlkbagurl", nullptr, kUnknown}}},
      {"boolean",
       {{"ZLKNoParallax", "true", ""},
        {"ZLKNoParallax", "0", ""},
        {"ZLKNoParallax", "\"1\"", kKind},
        {"ZLKNoParallax", "null", kKind},
        {"ZLKNoParallax", nullptr, ""}}},
      {"text", {{"ZLKBagURL", "\"\"", ""}, {"ZLKBagURL", "5", kKind}, {"ZLKBagURL", "[]", kKind}}},
      {"bytes, whole, from 0 to 9007199254740992",
       {{"ZLKMaximumBagSize", "0", ""},
        {"ZLKMaximumBagSize", "1e6", ""},
        {"ZLKMaximumBagSize", "9007199254740992", ""},
        {"ZLKMaximumBagSize", "1e16", kKind},
        {"ZLKMaximumBagSize", "-1", kKind},
        {"ZLKMaximumBagSize", "1.5", kKind},
        {"ZLKMaximumBagSize", "true", kKind},
        {"ZLKMaximumBagSize", "\"7\"", kKind}}},
      {"seconds, from 0 to 9007199254740992",
       {{"ZLKSessionMaxAge", "0.5", ""},
        {"ZLKSessionMaxAge", "-0.5", kKind},
        {"ZLKSessionMaxAge", "[1]", kKind}}},
      {"0 to 4",
       {{"ZLKLocationAuthorization", "4", ""},
        {"ZLKLocationAuthorization", "5", kKind},
        {"ZLKLocationAuthorization", "2.5", kKind}}},
      {"date",
       {{"ZelkorFirstUseOfTheDay_brelin", "{\"$date\": 1.5}", ""},
        {"ZelkorFirstUseOfTheDay_brelin", "1.5", kKind},
        {"ZelkorFirstUseOfTheDay_brelin", "{\"$date\": \"1\"}", kKind}}},
      {"list", {{"sessions", "[]", ""}, {"sessions", "{}", kKind}}},
  };
  for (const auto& [kind, cases] : kinds) {
    for (const auto& test : cases) {
      SCOPED_TRACE(std::string(test.key) + " " + (test.value ? test.value : "away"));
      const auto value = parseJson(test.value ? test.value : "null");
      auto refusal = std::string(test.refusal);
      if (test.refusal == kKind) refusal += kind;
      EXPECT_EQ(settingRefusal(test.key, test.value ? &*value : nullptr).value_or(""), refusal);
    }
  }
}

TEST(KnownSettingsTest, ReadsWhatIsRegisteredUnlessThereIsAValueOfTheKind) {
  FakeSettings settings;
  const auto read = [&settings] {
    const auto choice = choiceSetting(settings, "ZLKLocationAuthorization");
    return json::array{boolSetting(settings, "ZLKUseMorvane"),
                       boolSetting(settings, "ZLKNoParallax"),
                       stringSetting(settings, "ZLKBagURL"),
                       bytesSetting(settings, "ZLKMaximumBagSize"),
                       secondsSetting(settings, "ZLKSessionMaxAge"),
                       choice ? json::value(*choice) : nullptr,
                       listSetting(settings, "sessions")};
  };
  const json::array registered{true, false, "", 1'048'576u, 172'800.0, nullptr, json::array()};
  EXPECT_EQ(read(), registered);
  for (const auto& setting : kKnownSettings) settings.set(setting.key, json::object());
  EXPECT_EQ(read(), registered);

  struct Case {
    json::value number;  // for all but texts and lists
    json::array expected;
  };
  constexpr std::uint64_t kMost = 9'007'199'254'740'992;
  const Case cases[] = {
      {0, {false, false, "", 0u, 0.0, 0u, json::array()}},
      {4, {true, true, "", 4u, 4.0, 4u, json::array()}},
      {2.5, {true, true, "", 2u, 2.5, nullptr, json::array()}},
      {-1, {true, true, "", 0u, -1.0, nullptr, json::array()}},
      {1e17, {true, true, "", kMost, 1e17, nullptr, json::array()}},
  };
  for (const auto& [number, expected] : cases) {
    for (const auto& setting : kKnownSettings) settings.set(setting.key, number);
    EXPECT_EQ(read(), expected) << json::serialize(number);
  }
}

}  // namespace
}  // namespace zelkord
