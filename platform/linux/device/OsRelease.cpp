#include "platform/linux/device/OsRelease.h"

#include <algorithm>

namespace zelkord {
namespace {

// The value without its quotes; a backslash takes the next character as it is, except in single
// quotes.
std::string unquotedValue(std::string_view text) {
  std::string value;
  char quote = 0;
  for (std::size_t i = 0; i < text.size(); ++i) {
    const char c = text[i];
    if (quote == 0 && (c == '"' || c == '\'')) {
      quote = c;
    } else if (quote != 0 && c == quote) {
      quote = 0;
    } else if (c == '\\' && quote != '\'' && i + 1 < text.size()) {
      value += text[++i];
    } else {
      value += c;
    }
  }
  return value;
}

}  // namespace

std::map<std::string, std::string> parseOsRelease(std::string_view text) {
  std::map<std::string, std::string> values;
  while (!text.empty()) {
    auto line = text.substr(0, text.find('\n'));
    text.remove_prefix(std::min(line.size() + 1, text.size()));
    while (!line.empty() && (line.back() == '\r' || line.back() == ' ')) line.remove_suffix(1);
    const auto equals = line.find('=');
    if (equals == 0 || equals == std::string_view::npos || line.front() == '#') continue;
    values[std::string(line.substr(0, equals))] = unquotedValue(line.substr(equals + 1));
  }
  return values;
}

}  // namespace zelkord
