#include "platform/api/KnownSettings.h"

#include <algorithm>

namespace zelkord {
namespace {

constexpr KnownSetting kKnownSettings[] = {
    {"TraceEnabled", SettingKind::Boolean, "",
     "operations leave trace events in the kernel's `trace_marker`; read at the start"},
    {"ZLKBagURL", SettingKind::Text, "",
     "where the bag is fetched from, instead of the address that the build was given; a change "
     "counts from the next fetch"},
    {"ZLKDebugParameters", SettingKind::Text, "",
     "`name=value&name=value`: query items that most requests get besides their own; read at the "
     "start"},
    {"ZLKLocationAuthorization", SettingKind::Authorization, "",
     "the user's answer about location; read before the device profile's, save that 1 or 2 (no) "
     "from either wins; counts at once"},
    {"ZLKLogPrivateData", SettingKind::Boolean, "false",
     "texts that people typed, headers, identifiers and coordinates show in the log instead of "
     "`<private>`; counts at once"},
    {"ZLKMaximumBagSize", SettingKind::Bytes, "1048576",
     "a larger bag is an error (-1103) and the old one stays"},
    {"ZLKMaximumResourceSize", SettingKind::Bytes, "268435456",
     "for downloads of resources; nothing reads it yet"},
    {"ZLKMaximumResponseSize", SettingKind::Bytes, "8388608",
     "a larger response is an error (-1103)"},
    {"ZLKNoParallax", SettingKind::Boolean, "",
     "no TCP fast open and no TLS session tickets; read at the start"},
    {"ZLKNoQueryCache", SettingKind::Boolean, "",
     "no answers out of the query cache; read for each client identifier when it first comes"},
    {"ZLKPersistSessions", SettingKind::Boolean, "",
     "client identifiers and user agents are kept over restarts; read at the start"},
    {"ZLKSessionMaxAge", SettingKind::Seconds, "172800",
     "a stored feedback session that is older goes; read at the start"},
    {"ZLKSessionSizeLimit", SettingKind::Bytes, "2097152",
     "no file of a feedback session reaches it; read at the start"},
    {"ZLKSharedSession", SettingKind::Boolean, "true",
     "all clients share one feedback session and one user identifier; read at the start"},
    {"ZLKUseMorvane", SettingKind::Boolean, "true",
     "requests may go through the bag's routing proxy where the device profile switches it on; "
     "counts at once"},
    {"ZelkorFirstUseOfTheDay_", SettingKind::Date, "",
     "when that client was last used for the first time of a day; the daemon's own", true},
    {"sessions", SettingKind::List, "",
     "the clients that `ZLKPersistSessions` keeps; the daemon's own"},
};

}  // namespace

std::span<const KnownSetting> knownSettings() { return kKnownSettings; }

const KnownSetting* knownSetting(std::string_view key) {
  const auto* found = std::ranges::find_if(kKnownSettings, [key](const KnownSetting& setting) {
    return setting.isPrefix ? key.starts_with(setting.key) : key == setting.key;
  });
  return found == std::end(kKnownSettings) ? nullptr : found;
}

json::object registeredSettings() {
  json::object values;
  for (const auto& setting : kKnownSettings) {
    if (!setting.registered.empty()) values[setting.key] = *parseJson(setting.registered);
  }
  return values;
}

std::string_view nameOf(SettingKind kind) {
  switch (kind) {
    case SettingKind::Boolean:
      return "boolean";
    case SettingKind::Text:
      return "text";
    case SettingKind::Bytes:
      return "bytes";
    case SettingKind::Seconds:
      return "seconds";
    case SettingKind::Authorization:
      return "0 to 4";
    case SettingKind::Date:
      return "date";
    case SettingKind::List:
      return "list";
  }
  return "";
}

}  // namespace zelkord
