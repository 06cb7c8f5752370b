#pragma once

#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "base/Namespace.h"

namespace zelkord {

// What the host says about language and time zone, apart from the device profile.
struct HostLocale {
  std::string locale = "en_US";        // identifier
  std::vector<std::string> languages;  // BCP 47; empty: those of the locale
  std::string timeZone = "UTC";

  friend bool operator==(const HostLocale&, const HostLocale&) = default;
};

// Where it is said. `environment` gives a variable's value; "" and none are the same.
struct HostLocaleSources {
  std::function<std::string(const std::string& name)> environment;
  std::string localtimePath = "/etc/localtime";
  std::string timezonePath = "/etc/timezone";

  static HostLocaleSources ofProcess();
};

// The locale: LC_ALL, LC_MESSAGES, LANG, else en_US ("C" and "POSIX" count as unset); the
// languages: LANGUAGE; the time zone: TZ, the link, the file, else UTC.
HostLocale readHostLocale(const HostLocaleSources& sources);

}  // namespace zelkord
