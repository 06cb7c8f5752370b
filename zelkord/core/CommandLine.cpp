#include "zelkord/core/CommandLine.h"

#include <CLI/App.hpp>
#include <CLI/Config.hpp>
#include <CLI/Formatter.hpp>
#include <algorithm>
#include <charconv>
#include <cmath>
#include <map>

#include "base/CommandLineWords.h"

namespace zelkord {
namespace {

constexpr double kHighestClockRate = 100'000;

const std::map<std::string, LogLevel>& levelsByName() {
  static const std::map<std::string, LogLevel> kLevels = {{"debug", LogLevel::Debug},
                                                          {"info", LogLevel::Info},
                                                          {"default", LogLevel::Default},
                                                          {"error", LogLevel::Error}};
  return kLevels;
}

std::optional<double> decimalNumber(const std::string& text) {
  double number = 0;
  const auto* end = text.data() + text.size();
  const auto [stopped, problem] =
      std::from_chars(text.data(), end, number, std::chars_format::fixed);
  if (problem != std::errc() || stopped != end || !std::isfinite(number)) return std::nullopt;
  return number;
}

double numberFrom(const std::string& text, double least, double most, const std::string& wanted) {
  const auto number = decimalNumber(text);
  if (!number || *number < least || *number > most) throw CLI::ValidationError(wanted);
  return *number;
}

void addLogOptions(CLI::App& app, CommandLine& line) {
  app.add_option_function<std::string>(
         "--log-file",
         [&line](const std::string& path) {
           if (path.empty()) throw CLI::ValidationError("--log-file needs a path");
           line.logFile = path;
         },
         "Log to this file instead of the journal")
      ->type_name("PATH");
  app.add_option_function<std::string>(
         "--log-level",
         [&line](const std::string& name) {
           const auto level = levelsByName().find(name);
           if (level == levelsByName().end()) {
             throw CLI::ValidationError("--log-level is debug, info, default or error");
           }
           line.logLevel = level->second;
         },
         "The lowest level that is printed")
      ->type_name("debug|info|default|error");
}

void addTimeOptions(CLI::App& app, CommandLine& line) {
  app.add_option_function<std::string>(
         "--exit-when-idle",
         [&line](const std::string& text) {
           constexpr double kForEver = 1e12;
           line.exitWhenIdle = durationOfSeconds(
               numberFrom(text, 0, kForEver, "--exit-when-idle needs a number of seconds"));
         },
         "Leave when nothing has been under way for that long")
      ->type_name("SECONDS");
  app.add_option_function<std::string>(
         "--clock-rate",
         [&line](const std::string& text) {
           line.clockRate =
               numberFrom(text, 1, kHighestClockRate, "--clock-rate needs a number of 1 to 100000");
         },
         "Time runs N times as fast, for simulation: 1 to 100000")
      ->type_name("N");
}

void addFlags(CLI::App& app, CommandLine& line) {
  const auto asksFor = [&line](CommandLine::Action action) {
    return [&line, action] { line.action = action; };
  };
  app.add_flag_callback(
         "--no-session-bus", [&line] { line.sessionBus = false; }, "Serve the socket alone")
      ->disable_flag_override();
  app.add_flag_callback("--version", asksFor(CommandLine::Action::ShowVersion), "Show the version")
      ->disable_flag_override();
  app.add_flag_callback("-h,--help", asksFor(CommandLine::Action::ShowHelp), "Show this help")
      ->disable_flag_override();
}

void describe(CLI::App& app, CommandLine& line) {
  app.set_help_flag();
  app.option_defaults()->multi_option_policy(CLI::MultiOptionPolicy::TakeLast);
  addLogOptions(app, line);
  addTimeOptions(app, line);
  addFlags(app, line);
}

}  // namespace

std::variant<CommandLine, std::string> parseCommandLine(const std::vector<std::string>& arguments) {
  CommandLine line;
  CLI::App app;
  describe(app, line);
  auto words = withSeparateEmptyValues(arguments);
  std::reverse(words.begin(), words.end());  // as the parser takes them
  try {
    app.parse(std::move(words));
  } catch (const CLI::ParseError& problem) {
    return std::string(problem.what());
  }
  return line;
}

std::string usageText() {
  CommandLine unused;
  CLI::App app("The one broker between a device's search clients and a search-suggestion service.",
               "zelkord");
  describe(app, unused);
  return app.help();
}

}  // namespace zelkord
