#pragma once

#include <optional>
#include <string>
#include <vector>

#include "base/Namespace.h"
#include "platform/api/LocaleService.h"

namespace zelkord {

// The user's locale, in the words of requests. An empty text is left out of them.
struct LocaleContext {
  std::string identifier;
  std::string calendarIdentifier;
  std::string measurementSystem;   // "SI", "US", "UK"; empty for any other
  std::string preferredLanguages;  // JSON array of at most 3
  std::string tempUnits;           // one letter
  std::string effectiveSystemLanguage;
  std::string is24hDateFormat;  // "1" or empty

  friend bool operator==(const LocaleContext&, const LocaleContext&) = default;
};

// Without languages when they cannot be encoded as JSON.
LocaleContext localeContextOf(const LocaleSnapshot& locale);

// The first three as a JSON array; empty for an empty list, none when one is not valid UTF-8.
std::optional<std::string> languagesHeader(const std::vector<std::string>& languages);

}  // namespace zelkord
