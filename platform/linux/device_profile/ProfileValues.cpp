#include "platform/linux/device_profile/ProfileValues.h"

#include <algorithm>
#include <cmath>

#include "base/Text.h"
#include "platform/linux/locale_text/LocaleText.h"

namespace zelkord::profile {
namespace {

constexpr std::size_t kMaximumPlainText = 256;
constexpr std::size_t kMaximumBase64 = 64 * 1024;
constexpr std::size_t kMaximumLanguages = 100;

std::optional<std::string> textOf(const json::value& value) {
  if (!value.is_string()) return std::nullopt;
  return std::string(value.get_string());
}

bool isAsciiLetter(char c) { return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z'); }

bool isBase64Character(char c) {
  return isAsciiLetter(c) || (c >= '0' && c <= '9') || c == '+' || c == '/';
}

}  // namespace

std::optional<std::string> plainText(const json::value& value) {
  auto text = textOf(value);
  if (!text || text->size() > kMaximumPlainText || hasControlCharacters(*text)) return std::nullopt;
  return text;
}

std::optional<std::string> nonEmptyText(const json::value& value) {
  auto text = plainText(value);
  return text && !text->empty() ? text : std::nullopt;
}

std::optional<bool> flag(const json::value& value) {
  return value.is_bool() ? std::optional(value.get_bool()) : std::nullopt;
}

std::optional<double> numberWithin(const json::value& value, double low, double high) {
  const auto number = asNumber(value);
  return number && *number >= low && *number <= high ? number : std::nullopt;
}

std::optional<int> integerWithin(const json::value& value, int low, int high) {
  const auto number = numberWithin(value, low, high);
  if (!number || std::trunc(*number) != *number) return std::nullopt;
  return static_cast<int>(*number);
}

std::optional<std::string> localeIdentifier(const json::value& value) {
  const auto text = textOf(value);
  return text ? localeIdentifierOf(*text) : std::nullopt;
}

std::optional<std::vector<std::string>> languageTags(const json::value& value) {
  const auto* array = value.if_array();
  if (!array || array->size() > kMaximumLanguages) return std::nullopt;
  std::vector<std::string> tags;
  for (const auto& element : *array) {
    const auto text = textOf(element);
    auto tag = text ? languageTagOf(*text) : std::nullopt;
    if (!tag) return std::nullopt;
    tags.push_back(std::move(*tag));
  }
  return tags;
}

std::optional<std::string> countryCode(const json::value& value) {
  const auto text = textOf(value);
  if (!text || text->size() != 2 || !std::all_of(text->begin(), text->end(), isAsciiLetter)) {
    return std::nullopt;
  }
  return uppercased(*text);
}

std::optional<std::string> temperatureUnit(const json::value& value) {
  auto text = textOf(value);
  return text == "Celsius" || text == "Fahrenheit" ? text : std::nullopt;
}

std::optional<std::string> timeZone(const json::value& value) {
  auto text = textOf(value);
  return text && isKnownTimeZone(*text) ? text : std::nullopt;
}

std::optional<std::string> base64(const json::value& value) {
  auto text = textOf(value);
  if (!text || text->size() % 4 != 0 || text->size() > kMaximumBase64) return std::nullopt;
  std::string_view digits = *text;
  for (int padding = 0; padding < 2 && digits.ends_with('='); ++padding) digits.remove_suffix(1);
  return std::all_of(digits.begin(), digits.end(), isBase64Character) ? text : std::nullopt;
}

}  // namespace zelkord::profile
