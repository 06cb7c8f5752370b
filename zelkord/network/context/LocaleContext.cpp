#include "zelkord/network/context/LocaleContext.h"

#include <algorithm>

#include "zelkord/network/context/HeaderJson.h"

namespace zelkord {
namespace {

constexpr std::size_t kMaximumLanguages = 3;

std::string measurementName(std::string_view system) {
  if (system == "Metric") return "SI";
  if (system == "U.S.") return "US";
  if (system == "U.K.") return "UK";
  return {};
}

std::string firstCharacter(std::string_view text) {
  std::size_t length = std::min<std::size_t>(1, text.size());
  while (length < text.size() && (static_cast<unsigned char>(text[length]) & 0xC0) == 0x80) {
    ++length;
  }
  return std::string(text.substr(0, length));
}

}  // namespace

std::optional<std::string> languagesHeader(const std::vector<std::string>& languages) {
  if (languages.empty()) return std::string();
  json::array best;
  for (std::size_t i = 0; i < std::min(languages.size(), kMaximumLanguages); ++i) {
    best.emplace_back(languages[i]);
  }
  return headerJson(best);
}

LocaleContext localeContextOf(const LocaleSnapshot& locale) {
  const auto& temperature = locale.preferredTemperatureUnit.empty()
                                ? locale.temperatureUnit
                                : locale.preferredTemperatureUnit;
  LocaleContext context;
  context.identifier = locale.identifier;
  context.calendarIdentifier = locale.calendar;
  context.measurementSystem = measurementName(locale.measurementSystem);
  context.preferredLanguages = languagesHeader(locale.preferredLanguages).value_or("");
  context.tempUnits = firstCharacter(temperature);
  context.effectiveSystemLanguage = locale.effectiveSystemLanguage;
  if (locale.hourFormat.find("HH") != std::string::npos) context.is24hDateFormat = "1";
  return context;
}

}  // namespace zelkord
