#pragma once

#include <string>
#include <vector>

#include "base/Namespace.h"

namespace zelkord {

struct LocaleSnapshot {
  std::string identifier;                       // "en_US"
  std::string calendar;                         // ICU type, "gregorian"
  std::string measurementSystem;                // "Metric", "U.S.", "U.K." or another
  std::string hourFormat;                       // the date pattern for template "j", "h a" or "HH"
  std::string temperatureUnit;                  // of the locale: "Celsius" or "Fahrenheit"
  std::string preferredTemperatureUnit;         // the user's own choice; empty when there is none
  std::vector<std::string> preferredLanguages;  // BCP 47, best first
  std::string effectiveSystemLanguage;          // best system language for the preferred ones
};

// Answers from memory, on any thread; a change is announced in the notification centre.
class LocaleService {
 public:
  virtual ~LocaleService() = default;
  virtual LocaleSnapshot current() const = 0;    // changes: kCurrentLocaleChanged
  virtual std::string timeZoneName() const = 0;  // "Europe/Berlin"; changes: kTimeZoneChanged
};

}  // namespace zelkord
