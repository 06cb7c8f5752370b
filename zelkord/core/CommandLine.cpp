#include "zelkord/core/CommandLine.h"

#include <charconv>
#include <cmath>
#include <map>

namespace zelkord {
namespace {

constexpr double kHighestClockRate = 100'000;

std::optional<double> decimalNumber(const std::string& text) {
  double number = 0;
  const auto* end = text.data() + text.size();
  const auto [stopped, problem] =
      std::from_chars(text.data(), end, number, std::chars_format::fixed);
  if (problem != std::errc() || stopped != end || !std::isfinite(number)) return std::nullopt;
  return number;
}

// Sets one option; the text says what is wrong, empty when nothing is.
std::string setOption(CommandLine& line, const std::string& name, const std::string& value) {
  static const std::map<std::string, LogLevel> kLevels = {{"debug", LogLevel::Debug},
                                                          {"info", LogLevel::Info},
                                                          {"default", LogLevel::Default},
                                                          {"error", LogLevel::Error}};
  if (name == "--log-file") {
    if (value.empty()) return "--log-file needs a path";
    line.logFile = value;
  } else if (name == "--log-level") {
    const auto level = kLevels.find(value);
    if (level == kLevels.end()) return "--log-level is debug, info, default or error";
    line.logLevel = level->second;
  } else if (name == "--exit-when-idle") {
    const auto seconds = decimalNumber(value);
    if (!seconds || *seconds < 0) return "--exit-when-idle needs a number of seconds";
    line.exitWhenIdle = durationOfSeconds(*seconds);
  } else if (name == "--clock-rate") {
    const auto rate = decimalNumber(value);
    if (!rate || *rate < 1 || *rate > kHighestClockRate) {
      return "--clock-rate needs a number of 1 to 100000";
    }
    line.clockRate = *rate;
  } else {
    return "unknown option " + name;
  }
  return {};
}

bool setFlag(CommandLine& line, const std::string& name) {
  if (name == "--no-session-bus") {
    line.sessionBus = false;
  } else if (name == "--version") {
    line.action = CommandLine::Action::ShowVersion;
  } else if (name == "--help") {
    line.action = CommandLine::Action::ShowHelp;
  } else {
    return false;
  }
  return true;
}

}  // namespace

std::variant<CommandLine, std::string> parseCommandLine(const std::vector<std::string>& arguments) {
  CommandLine line;
  for (std::size_t i = 0; i < arguments.size(); ++i) {
    const auto& argument = arguments[i];
    if (setFlag(line, argument)) continue;
    if (argument.rfind("--", 0) != 0) return "unexpected argument " + argument;
    const auto equals = argument.find('=');
    const auto name = argument.substr(0, equals);
    std::string value;
    if (equals != std::string::npos) {
      value = argument.substr(equals + 1);
    } else if (i + 1 < arguments.size()) {
      value = arguments[++i];
    }
    if (auto problem = setOption(line, name, value); !problem.empty()) return problem;
  }
  return line;
}

std::string usageText() {
  return "usage: zelkord [--log-file PATH] [--log-level debug|info|default|error]\n"
         "               [--exit-when-idle SECONDS] [--clock-rate N] [--no-session-bus]\n"
         "               [--version] [--help]\n";
}

}  // namespace zelkord
