#include <gmock/gmock.h>

#include <fstream>

#include "platform/api/KnownSettings.h"
#include "platform/api/SettingsStore.h"
#include "platform/testing/FakeSettings.h"

namespace zelkord {
namespace {

// The rows of the page's table of settings.
std::vector<std::string> documentedRows() {
  std::ifstream page(ZK_SOURCE_DIR "/docs/settings.md");
  std::vector<std::string> rows;
  bool isInside = false;
  for (std::string line; std::getline(page, line);) {
    if (line.starts_with("## ")) isInside = line == "## All settings";
    if (isInside && line.starts_with("| `")) rows.push_back(line);
  }
  return rows;
}

std::string rowOf(const KnownSetting& setting) {
  const std::string key(setting.key);
  return "| `" + key + (setting.isPrefix ? "CLIENT" : "") + "` | " +
         std::string(nameOf(setting.kind)) + " | " +
         (setting.registered.empty() ? "none" : std::string(setting.registered)) + " | " +
         std::string(setting.meaning) + " |";
}

TEST(SettingsPageTest, ListsWhatTheDaemonReads) {
  std::vector<std::string> expected;
  for (const auto& setting : knownSettings()) expected.push_back(rowOf(setting));
  EXPECT_THAT(documentedRows(), testing::ElementsAreArray(expected));
}

TEST(SettingsPageTest, ASettingThatStandsNowhereCannotBeRead) {
  const FakeSettings settings;
  EXPECT_FALSE(boolSetting(settings, "ZLKNoQueryCache"));
  EXPECT_DEATH(boolSetting(settings, "ZLKNoSuchSetting"), "stands in the table");
  EXPECT_DEATH(unsignedSetting(settings, "ZLKMaximumBagSize2"), "stands in the table");
  EXPECT_TRUE(knownSetting("ZelkorFirstUseOfTheDay_brelin"));
}

TEST(SettingsPageTest, RegisteredValuesHaveTheirKind) {
  const auto registered = registeredSettings();
  EXPECT_THAT(registered, testing::SizeIs(8));
  for (const auto& [key, value] : registered) {
    SCOPED_TRACE(std::string(key));
    const auto kind = knownSetting(key)->kind;
    EXPECT_EQ(value.is_bool(), kind == SettingKind::Boolean);
    EXPECT_EQ(value.is_number(), kind == SettingKind::Bytes || kind == SettingKind::Seconds);
  }
}

}  // namespace
}  // namespace zelkord
