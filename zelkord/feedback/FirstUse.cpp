#include "zelkord/feedback/FirstUse.h"

#include <unicode/calendar.h>
#include <unicode/timezone.h>

#include <array>
#include <memory>

#include "base/Text.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/assembly/ClientShortName.h"

namespace zelkord {
namespace {

constexpr std::array<std::string_view, 6> _supportedFirstUseClients = {
    "brelin", "lanthe", "lookup", "messages", "news", "vocari"};

std::optional<WallTime> dateSetting(const SettingsStore& settings, std::string_view key) {
  const auto value = settings.value(key);
  const auto* object = value ? value->if_object() : nullptr;
  const auto seconds = object ? numberIn(*object, "$date") : std::nullopt;
  return seconds ? std::optional(wallTimeOfSeconds(*seconds)) : std::nullopt;
}

}  // namespace

FirstUse::FirstUse(Assembly& assembly, const std::optional<std::string>& agent)
    : assembly_(assembly) {
  const auto key = _getUserDefaultKey(agent);
  if (key) firstUseDate_ = dateSetting(assembly.userDefaults(), *key);
}

std::optional<std::string> FirstUse::_getUserDefaultKey(const std::optional<std::string>& agent) {
  if (!agent) return std::nullopt;
  const auto lower = lowercased(*agent);
  std::optional<std::string> key;
  for (const auto client : _supportedFirstUseClients) {
    if (lower.find(client) == std::string::npos) continue;
    key = "ZelkorFirstUseOfTheDay_" + std::string(client);
  }
  return key;
}

bool FirstUse::_firstUseOfTheDay(const std::optional<std::string>& agent) {
  const auto now = assembly_.platform().clock.wallNow();
  if (firstUseDate_ && _dayOfMonth(now) == _dayOfMonth(*firstUseDate_)) return false;
  return _updateFirstUseDate(now, agent);
}

bool FirstUse::_updateFirstUseDate(WallTime date, const std::optional<std::string>& agent) {
  firstUseDate_ = date;
  const auto key = _getUserDefaultKey(agent);
  if (!key) {
    assembly_.log(Category::Session).debug("no first use of the day for this agent");
    return false;
  }
  auto& settings = assembly_.userDefaults();
  settings.set(*key, json::object{{"$date", secondsSince1970(date)}});
  settings.flush();
  if (const auto name = clientShortName(*key)) {
    assembly_.reporter().addValue(1, createAggdKey(*name, "dailyactiveusers"));
  }
  return true;
}

int FirstUse::_dayOfMonth(WallTime time) const {
  const auto& locale = assembly_.platform().locale;
  const auto zone = icu::UnicodeString::fromUTF8(locale.timeZoneName());
  const auto snapshot = locale.current();
  UErrorCode status = U_ZERO_ERROR;
  icu::Locale calendarLocale(snapshot.identifier.c_str());
  calendarLocale.setKeywordValue("calendar", snapshot.calendar.c_str(), status);
  const std::unique_ptr<icu::Calendar> calendar(
      icu::Calendar::createInstance(icu::TimeZone::createTimeZone(zone), calendarLocale, status));
  if (!calendar) return 0;
  constexpr double kMillisecondsPerSecond = 1000;
  calendar->setTime(secondsSince1970(time) * kMillisecondsPerSecond, status);
  return calendar->get(UCAL_DATE, status);
}

}  // namespace zelkord
