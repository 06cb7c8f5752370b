#include <gtest/gtest.h>

#include <fstream>
#include <regex>
#include <sstream>

#include "zelkorctl/Help.h"
#include "zelkorctl/Options.h"

namespace zelkorctl {
namespace {

std::string sourceFile(const std::string& path) {
  std::ostringstream text;
  text << std::ifstream(std::string(ZK_SOURCE_DIR "/") + path).rdbuf();
  return text.str();
}

// Whether the word stands there on its own, so that "--id" is not found in "--identity".
bool names(const std::string& text, std::string_view word) {
  return std::regex_search(text, std::regex("(^|[^a-z-])" + std::string(word) + "($|[^a-z-])"));
}

TEST(DocumentsTest, NameEveryCommandAndOption) {
  const auto manual =
      std::regex_replace(sourceFile("packaging/man/zelkorctl.1"), std::regex(R"(\\-)"), "-");
  const auto completion = sourceFile("packaging/completions/bash/zelkorctl");
  const auto overview = std::string(helpText(Command::Help));
  for (const auto& [name, command] : allCommands()) {
    SCOPED_TRACE(name);
    EXPECT_TRUE(names(overview, name));
    EXPECT_TRUE(names(manual, name));
    EXPECT_TRUE(names(completion, name));
    const auto help = overview + std::string(helpText(command));
    for (const auto option : optionsOf(command)) {
      SCOPED_TRACE(option);
      EXPECT_TRUE(names(help, option));
      EXPECT_TRUE(names(manual, option));
      EXPECT_TRUE(names(completion, option));
    }
  }
}

}  // namespace
}  // namespace zelkorctl
