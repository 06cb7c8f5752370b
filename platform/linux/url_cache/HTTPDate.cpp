#include "platform/linux/url_cache/HTTPDate.h"

#include <algorithm>
#include <cstddef>

namespace zelkord {
namespace {

struct DateFields {
  int year = 0, month = 0, day = 0, hour = 0, minute = 0, second = 0;
};

bool isDateDigit(char c) { return c >= '0' && c <= '9'; }
bool isWeekdayLetter(char c) { return (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z'); }

// From 1; 0 for what is no month.
int monthOf(std::string_view name) {
  constexpr std::string_view kMonths = "JanFebMarAprMayJunJulAugSepOctNovDec";
  const auto place = kMonths.find(name);
  return place == std::string_view::npos || place % 3 != 0 ? 0 : static_cast<int>(place / 3) + 1;
}

int* numberField(DateFields& fields, char code) {
  switch (code) {
    case 'Y':
      return &fields.year;
    case 'D':
      return &fields.day;
    case 'h':
      return &fields.hour;
    case 'm':
      return &fields.minute;
    case 's':
      return &fields.second;
    default:
      return nullptr;
  }
}

// In a pattern Y, D, h, m and s stand for a digit of their field, d for one that may be a space,
// "Mon" for a month's name, everything else for itself.
std::optional<DateFields> matchDate(std::string_view pattern, std::string_view text) {
  if (pattern.size() != text.size()) return std::nullopt;
  DateFields fields;
  for (std::size_t i = 0; i < pattern.size(); ++i) {
    if (pattern.substr(i).starts_with("Mon")) {
      fields.month = monthOf(text.substr(i, 3));
      i += 2;
    } else if (pattern[i] == 'd' && text[i] == ' ') {
      continue;
    } else if (int* const field = numberField(fields, pattern[i] == 'd' ? 'D' : pattern[i])) {
      if (!isDateDigit(text[i])) return std::nullopt;
      *field = *field * 10 + (text[i] - '0');
    } else if (pattern[i] != text[i]) {
      return std::nullopt;
    }
  }
  return fields;
}

std::optional<std::chrono::sys_seconds> timeOf(const DateFields& fields) {
  using namespace std::chrono;
  const year_month_day date(year(fields.year), month(static_cast<unsigned>(fields.month)),
                            day(static_cast<unsigned>(fields.day)));
  // A leap second counts as the first one after it.
  if (!date.ok() || fields.hour > 23 || fields.minute > 59 || fields.second > 60) return {};
  return sys_days(date) + hours(fields.hour) + minutes(fields.minute) + seconds(fields.second);
}

int yearOf(std::chrono::sys_seconds time) {
  const auto day = std::chrono::floor<std::chrono::days>(time);
  return static_cast<int>(std::chrono::year_month_day(day).year());
}

std::optional<DateFields> matchAfterWeekday(std::string_view text, std::chrono::sys_seconds now) {
  if (auto fields = matchDate("DD Mon YYYY hh:mm:ss GMT", text)) return fields;
  auto fields = matchDate("DD-Mon-YY hh:mm:ss GMT", text);
  if (!fields) return std::nullopt;
  const int thisYear = yearOf(now);
  fields->year += thisYear - thisYear % 100;
  if (fields->year > thisYear + 50) fields->year -= 100;
  return fields;
}

}  // namespace

std::optional<std::chrono::sys_seconds> parseHTTPDate(std::string_view text,
                                                      std::chrono::sys_seconds now) {
  const auto weekdayEnd = std::min(text.find_first_of(", "), text.size());
  const auto weekday = text.substr(0, weekdayEnd);
  if (weekday.size() < 3 || !std::ranges::all_of(weekday, isWeekdayLetter)) return std::nullopt;
  auto rest = text.substr(weekdayEnd);
  const bool hasComma = rest.starts_with(", ");
  rest.remove_prefix(std::min<std::size_t>(hasComma ? 2 : 1, rest.size()));
  const auto fields =
      hasComma ? matchAfterWeekday(rest, now) : matchDate("Mon dD hh:mm:ss YYYY", rest);
  return fields ? timeOf(*fields) : std::nullopt;
}

}  // namespace zelkord
