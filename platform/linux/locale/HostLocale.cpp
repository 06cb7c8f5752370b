#include "platform/linux/locale/HostLocale.h"

#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <fstream>

#include "platform/linux/locale_text/LocaleText.h"

namespace zelkord {
namespace {

std::string hostLocaleIdentifier(const HostLocaleSources& sources) {
  for (const char* variable : {"LC_ALL", "LC_MESSAGES", "LANG"}) {
    const auto value = sources.environment(variable);
    if (value.empty()) continue;
    return localeIdentifierOf(value).value_or("en_US");
  }
  return "en_US";
}

std::vector<std::string> hostLanguages(const HostLocaleSources& sources) {
  std::vector<std::string> languages;
  const auto list = sources.environment("LANGUAGE");
  for (std::size_t begin = 0; begin < list.size();) {
    const auto end = std::min(list.find(':', begin), list.size());
    if (auto tag = languageTagOf(list.substr(begin, end - begin))) languages.push_back(*tag);
    begin = end + 1;
  }
  return languages;
}

// ":Europe/Berlin", "Europe/Berlin" or a path into the database.
std::string zoneOfText(std::string text) {
  constexpr std::string_view kDatabase = "zoneinfo/";
  if (text.starts_with(':')) text.erase(0, 1);
  if (const auto at = text.find(kDatabase); at != std::string::npos)
    text.erase(0, at + kDatabase.size());
  for (const std::string_view prefix : {"posix/", "right/"}) {
    if (text.starts_with(prefix)) text.erase(0, prefix.size());
  }
  return isKnownTimeZone(text) ? text : std::string();
}

std::string linkTarget(const std::string& path) {
  char target[4096];
  const auto size = ::readlink(path.c_str(), target, sizeof target);
  return size > 0 ? std::string(target, static_cast<std::size_t>(size)) : std::string();
}

std::string firstLineOf(const std::string& path) {
  std::ifstream file(path);
  std::string line;
  std::getline(file, line);
  return line.substr(0, line.find_last_not_of(" \t\r") + 1);
}

std::string hostTimeZone(const HostLocaleSources& sources) {
  for (const auto& text : {sources.environment("TZ"), linkTarget(sources.localtimePath),
                           firstLineOf(sources.timezonePath)}) {
    if (auto zone = zoneOfText(text); !zone.empty()) return zone;
  }
  return "UTC";
}

}  // namespace

HostLocaleSources HostLocaleSources::ofProcess() {
  HostLocaleSources sources;
  sources.environment = [](const std::string& name) -> std::string {
    const char* value = std::getenv(name.c_str());
    return value ? value : "";
  };
  return sources;
}

HostLocale readHostLocale(const HostLocaleSources& sources) {
  HostLocale host;
  host.locale = hostLocaleIdentifier(sources);
  host.languages = hostLanguages(sources);
  host.timeZone = hostTimeZone(sources);
  return host;
}

}  // namespace zelkord
