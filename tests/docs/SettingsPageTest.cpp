#include <gmock/gmock.h>

#include <fstream>

#include "platform/api/KnownSettings.h"

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
  const auto registered = registeredSettings();
  const auto* value = registered.if_contains(setting.key);
  return "| `" + key + (setting.isPrefix ? "CLIENT" : "") + "` | " + kindText(setting) + " | " +
         (value ? json::serialize(*value) : "none") + " | " + std::string(setting.meaning) + " |";
}

TEST(SettingsPageTest, ListsWhatTheDaemonReads) {
  std::vector<std::string> expected;
  for (const auto& setting : kKnownSettings) expected.push_back(rowOf(setting));
  EXPECT_THAT(documentedRows(), testing::ElementsAreArray(expected));
}

}  // namespace
}  // namespace zelkord
