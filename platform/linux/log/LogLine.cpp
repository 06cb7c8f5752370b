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

// What a line has besides its text: stamp, level, category, and how much is missing.
constexpr std::size_t kBesideTheText = 160;

bool isEscaped(char c) { return c == '\n' || c == '\r' || c == '\t' || c == '\\'; }

bool isContinuation(char c) { return (static_cast<unsigned char>(c) & 0xC0) == 0x80; }

// Of the text, as many bytes as a line takes.
std::size_t lengthThatFits(std::string_view text) {
  std::size_t room = kLongestLogLine - kBesideTheText;
  for (std::size_t length = 0; length < text.size(); ++length) {
    const std::size_t size = isEscaped(text[length]) ? 2 : 1;
    if (size > room) return length;
    room -= size;
  }
  return text.size();
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

std::string shortenedLogText(std::string_view text) {
  auto length = lengthThatFits(text);
  if (length == text.size()) return std::string(text);
  while (length > 0 && isContinuation(text[length])) --length;
  return fmt::format("{}... ({} more bytes)", text.substr(0, length), text.size() - length);
}

std::string logLine(WallTime time, LogLevel level, std::string_view category,
                    std::string_view text) {
  auto line =
      fmt::format("{} {} {} ", utcStamp(time), logLevelName(level), logCategoryName(category));
  appendEscaped(line, text);
  return line;
}

}  // namespace zelkord
