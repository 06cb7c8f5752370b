#include "platform/linux/log/LogLine.h"

#include <fmt/format.h>

#include <ctime>

namespace zelkord {
namespace {

void appendEscaped(std::string& line, std::string_view text) {
  while (true) {
    const auto plain = text.substr(0, text.find_first_of("\n\r\t\\"));
    line += plain;
    if (plain.size() == text.size()) return;
    const char c = text[plain.size()];
    line += '\\';
    line += c == '\n' ? 'n' : c == '\r' ? 'r' : c == '\t' ? 't' : c;
    text.remove_prefix(plain.size() + 1);
  }
}

std::string utcStamp(WallTime time) {
  const auto seconds = std::chrono::floor<std::chrono::seconds>(time);
  const auto micros = std::chrono::floor<std::chrono::microseconds>(time - seconds).count();
  const std::time_t unixTime = seconds.time_since_epoch().count();
  std::tm utc{};
  ::gmtime_r(&unixTime, &utc);
  return fmt::format("{:04}-{:02}-{:02}T{:02}:{:02}:{:02}.{:06}Z", utc.tm_year + 1900,
                     utc.tm_mon + 1, utc.tm_mday, utc.tm_hour, utc.tm_min, utc.tm_sec, micros);
}

}  // namespace

std::string_view logLevelName(LogLevel level) {
  switch (level) {
    case LogLevel::Debug:
      return "debug";
    case LogLevel::Info:
      return "info";
    case LogLevel::Default:
      return "default";
    case LogLevel::Error:
      return "error";
    case LogLevel::Fault:
      return "fault";
  }
  return "default";
}

std::optional<LogLevel> logLevelFromName(std::string_view name) {
  for (const auto level : {LogLevel::Debug, LogLevel::Info, LogLevel::Default, LogLevel::Error}) {
    if (logLevelName(level) == name) return level;
  }
  return std::nullopt;
}

std::string_view logCategoryName(std::string_view category) {
  return category.empty() ? "default" : category;
}

std::string logLine(WallTime time, LogLevel level, std::string_view category,
                    std::string_view text) {
  auto line =
      fmt::format("{} {} {} ", utcStamp(time), logLevelName(level), logCategoryName(category));
  appendEscaped(line, text);
  return line;
}

}  // namespace zelkord
