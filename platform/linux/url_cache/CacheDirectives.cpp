#include "platform/linux/url_cache/CacheDirectives.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>

namespace zelkord {
namespace {

using Seconds = std::chrono::seconds;

// The number of a directive; none for one that is missing or damaged.
std::optional<Seconds> directiveSeconds(std::string_view value) {
  if (value.size() >= 2 && value.front() == '"' && value.back() == '"') {
    value = value.substr(1, value.size() - 2);
  }
  return parseDeltaSeconds(value);
}

void meetMaxAge(CacheDirectives& directives, std::optional<Seconds> value) {
  const bool contradicts = directives.maxAge && directives.maxAge != value;
  directives.maxAge = contradicts ? Seconds(0) : value.value_or(Seconds(0));
}

void meetDirective(CacheDirectives& directives, std::string_view element) {
  const auto equals = std::min(element.find('='), element.size());
  const auto name = lowerCasedASCII(withoutWhiteSpaceAround(element.substr(0, equals)));
  const auto value = withoutWhiteSpaceAround(element.substr(std::min(equals + 1, element.size())));
  if (name == "no-store") {
    directives.noStore = true;
  } else if (name == "no-cache") {
    directives.noCache = true;
  } else if (name == "must-understand") {
    directives.mustUnderstand = true;
  } else if (name == "max-age") {
    meetMaxAge(directives, directiveSeconds(value));
  } else if (name == "min-fresh") {
    directives.minFresh =
        std::max(directives.minFresh, directiveSeconds(value).value_or(CacheDirectives::kMaximum));
  }
}

}  // namespace

std::string_view withoutWhiteSpaceAround(std::string_view text) {
  const auto first = text.find_first_not_of(" \t");
  if (first == std::string_view::npos) return {};
  return text.substr(first, text.find_last_not_of(" \t") - first + 1);
}

std::string lowerCasedASCII(std::string_view text) {
  std::string lower(text);
  for (char& c : lower) c = c >= 'A' && c <= 'Z' ? static_cast<char>(c + 32) : c;
  return lower;
}

std::optional<std::string_view> takeListElement(std::string_view& rest) {
  bool quoted = false;
  std::size_t end = 0;
  for (; end < rest.size() && (quoted || rest[end] != ','); ++end) {
    if (rest[end] == '"') quoted = !quoted;
    if (quoted && rest[end] == '\\') ++end;
  }
  if (quoted || end > rest.size()) {
    rest = {};
    return std::nullopt;
  }
  const auto element = withoutWhiteSpaceAround(rest.substr(0, end));
  rest.remove_prefix(std::min(end + 1, rest.size()));
  return element;
}

std::optional<Seconds> parseDeltaSeconds(std::string_view text) {
  if (text.empty()) return std::nullopt;
  std::int64_t value = 0;
  for (const char c : text) {
    if (c < '0' || c > '9') return std::nullopt;
    value = std::min<std::int64_t>(value * 10 + (c - '0'), CacheDirectives::kMaximum.count());
  }
  return Seconds(value);
}

CacheDirectives parseCacheDirectives(std::string_view header) {
  CacheDirectives directives;
  while (!header.empty()) {
    const auto element = takeListElement(header);
    if (!element) {
      directives.noStore = true;
      break;
    }
    meetDirective(directives, *element);
  }
  return directives;
}

}  // namespace zelkord
