#include "platform/linux/url_cache/CacheVary.h"

#include <algorithm>
#include <set>
#include <utility>

#include "platform/linux/url_cache/CacheDirectives.h"

namespace zelkord {
namespace {

bool isFieldName(std::string_view text) {
  return std::ranges::all_of(text, [](char c) {
    return (c >= 'a' && c <= 'z') || (c >= '0' && c <= '9') || c == '-' || c == '_' || c == '.';
  });
}

void appendValue(std::string& text, const std::optional<std::string>& value) {
  text += value ? "=" + std::to_string(value->size()) + ":" : "-";
  text += value.value_or("");
}

}  // namespace

std::optional<std::string> varyNames(const URLResponse& response) {
  const auto header = response.header("Vary").value_or("");
  std::set<std::string> names;
  for (std::string_view rest = header; !rest.empty();) {
    const auto element = takeListElement(rest);
    auto name = lowerCasedASCII(element.value_or("*"));
    if (!isFieldName(name)) return std::nullopt;
    if (!name.empty()) names.insert(std::move(name));
  }
  std::string joined;
  for (const auto& name : names) joined += (joined.empty() ? "" : ",") + name;
  return joined.size() <= kMaximumVaryNames ? std::optional(std::move(joined)) : std::nullopt;
}

Digest variantOf(std::string_view names, const URLRequest& request) {
  if (names.empty()) return {};
  std::string values;
  for (auto rest = names; !rest.empty();) {
    auto value = request.header(takeListElement(rest).value_or(""));
    if (value) value = std::string(withoutWhiteSpaceAround(*value));
    appendValue(values, value);
  }
  return digestOfParts({names, values});
}

}  // namespace zelkord
