#include <gmock/gmock.h>

#include <fstream>
#include <regex>
#include <set>

#include "zelkord/core/CommandLine.h"

namespace zelkord {
namespace {

std::set<std::string> optionsIn(const std::string& text) {
  static const std::regex kOption("--[a-z][a-z-]*");
  return {std::sregex_token_iterator(text.begin(), text.end(), kOption), {}};
}

TEST(ManualPageTest, HasTheDaemonsOptionsAndNoOthers) {
  std::ifstream file(ZK_SOURCE_DIR "/packaging/man/zelkord.8");
  const std::string page{std::istreambuf_iterator<char>(file), {}};
  EXPECT_THAT(optionsIn(std::regex_replace(page, std::regex(R"(\\-)"), "-")),
              testing::ContainerEq(optionsIn(usageText())));
}

}  // namespace
}  // namespace zelkord
