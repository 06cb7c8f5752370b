#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "base/Time.h"

namespace zelkord {

class Assembly;

// The day on which a client was last used for the first time, kept in the settings: the start of a
// session finds out whether it is the client's first of the day.
//
// Only the day of the month is compared, in the calendar and time zone of the user: the same day of
// another month counts as the same day.
//
// Threading: one thread. Ownership: the assembly outlives it.
class FirstUse final {
 public:
  // Takes over what the settings have for that user agent.
  FirstUse(Assembly& assembly, const std::optional<std::string>& agent);

  const std::optional<WallTime>& firstUseDate() const { return firstUseDate_; }

  // Whether now is on another day than the date there is; if so, or without a date, it becomes
  // now and is stored. False for an agent that has no key.
  bool _firstUseOfTheDay(const std::optional<std::string>& agent);

  // Where the date of that agent's client is kept: "ZelkorFirstUseOfTheDay_" and the last of the
  // supported clients whose name the lower-cased agent contains. None for other agents.
  static std::optional<std::string> _getUserDefaultKey(const std::optional<std::string>& agent);

 private:
  // Stores the date and counts an active day of the client.
  bool _updateFirstUseDate(WallTime date, const std::optional<std::string>& agent);
  int _dayOfMonth(WallTime time) const;

  Assembly& assembly_;
  std::optional<WallTime> firstUseDate_;
};

}  // namespace zelkord
