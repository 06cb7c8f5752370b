#include "platform/linux/locale/LocaleFacts.h"

#include <unicode/calendar.h>
#include <unicode/dtptngen.h>
#include <unicode/localematcher.h>
#include <unicode/locid.h>
#include <unicode/numberformatter.h>
#include <unicode/ulocdata.h>

#include <memory>

#include "platform/linux/locale_text/LocaleText.h"

namespace zelkord {
namespace {

std::string utf8Of(const icu::UnicodeString& text) {
  std::string utf8;
  return text.toUTF8String(utf8);
}

std::string calendarOf(const icu::Locale& locale) {
  UErrorCode status = U_ZERO_ERROR;
  const std::unique_ptr<icu::Calendar> calendar(icu::Calendar::createInstance(locale, status));
  return U_SUCCESS(status) ? calendar->getType() : "gregorian";
}

std::string measurementSystemOf(const icu::Locale& locale) {
  UErrorCode status = U_ZERO_ERROR;
  const auto system = ulocdata_getMeasurementSystem(locale.getName(), &status);
  if (U_FAILURE(status)) return "";
  return system == UMS_SI ? "Metric" : system == UMS_US ? "U.S." : system == UMS_UK ? "U.K." : "";
}

std::string hourFormatOf(const icu::Locale& locale) {
  UErrorCode status = U_ZERO_ERROR;
  const std::unique_ptr<icu::DateTimePatternGenerator> generator(
      icu::DateTimePatternGenerator::createInstance(locale, status));
  if (U_FAILURE(status)) return "";
  const auto pattern = generator->getBestPattern(icu::UnicodeString("j"), status);
  return U_SUCCESS(status) ? utf8Of(pattern) : "";
}

// The unit that weather reports of the region use.
std::string temperatureUnitOf(const icu::Locale& locale) {
  UErrorCode status = U_ZERO_ERROR;
  const auto formatted = icu::number::NumberFormatter::withLocale(locale)
                             .unit(icu::MeasureUnit::getCelsius())
                             .usage("weather")
                             .formatDouble(20, status);
  const auto unit = formatted.getOutputUnit(status);
  if (U_FAILURE(status)) return "Celsius";
  return std::string_view(unit.getIdentifier()) == "fahrenheit" ? "Fahrenheit" : "Celsius";
}

std::vector<icu::Locale> localesOf(const std::vector<std::string>& tags) {
  std::vector<icu::Locale> locales;
  for (const auto& tag : tags) {
    UErrorCode status = U_ZERO_ERROR;
    locales.push_back(icu::Locale::forLanguageTag(tag, status));
  }
  return locales;
}

// The system language that serves the preferred ones best, else the first.
std::string bestSystemLanguage(const std::vector<std::string>& system,
                               const std::vector<std::string>& preferred) {
  auto supported = localesOf(system);
  auto desired = localesOf(preferred);
  UErrorCode status = U_ZERO_ERROR;
  const auto matcher = icu::LocaleMatcher::Builder()
                           .setSupportedLocales(supported.begin(), supported.end())
                           .build(status);
  icu::Locale::RangeIterator<std::vector<icu::Locale>::iterator> iterator(desired.begin(),
                                                                          desired.end());
  const auto match = matcher.getBestMatchResult(iterator, status);
  const auto index = U_SUCCESS(status) ? match.getSupportedIndex() : -1;
  return system[index < 0 ? 0 : static_cast<std::size_t>(index)];
}

std::vector<std::string> preferredLanguages(const DeviceProfile& profile, const HostLocale& host,
                                            const std::string& locale) {
  if (!profile.preferredLanguages.empty()) return profile.preferredLanguages;
  if (!host.languages.empty()) return host.languages;
  return {languageTagOf(locale).value_or("en-US")};
}

}  // namespace

LocaleSnapshot localeFacts(const DeviceProfile& profile, const HostLocale& host) {
  LocaleSnapshot facts;
  facts.identifier = profile.locale.value_or(host.locale);
  const icu::Locale locale(facts.identifier.c_str());
  facts.calendar = calendarOf(locale);
  facts.measurementSystem = measurementSystemOf(locale);
  facts.hourFormat = hourFormatOf(locale);
  facts.temperatureUnit = temperatureUnitOf(locale);
  facts.preferredTemperatureUnit = profile.temperatureUnit.value_or("");
  facts.preferredLanguages = preferredLanguages(profile, host, facts.identifier);
  const auto& system =
      profile.systemLanguages.empty() ? facts.preferredLanguages : profile.systemLanguages;
  facts.effectiveSystemLanguage = bestSystemLanguage(system, facts.preferredLanguages);
  return facts;
}

}  // namespace zelkord
