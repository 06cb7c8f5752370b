#pragma once

#include <optional>
#include <string>
#include <variant>
#include <vector>

#include "base/Time.h"
#include "platform/api/Log.h"

namespace zelkord {

// What the daemon was started with.
struct CommandLine {
  enum class Action { Run, ShowVersion, ShowHelp };

  Action action = Action::Run;
  std::optional<std::string> logFile;
  LogLevel logLevel = LogLevel::Default;
  std::optional<Duration> exitWhenIdle;
  double clockRate = 1;  // 1 to 100000
  bool sessionBus = true;
};

// The command line, or what is wrong with it.
std::variant<CommandLine, std::string> parseCommandLine(const std::vector<std::string>& arguments);

std::string usageText();

}  // namespace zelkord
