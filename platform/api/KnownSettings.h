#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <variant>

#include "base/Json.h"

namespace zelkord {

// What a setting's value is. A value of another kind counts as absent.
enum class SettingKind {
  Boolean,  // a number too: not 0 is true
  Text,
  Bytes,
  Seconds,
  Choice,  // a whole number
  Date,
  List,
};

// Of numbers; none is larger than every reader of JSON tells exactly.
struct SettingRange {
  std::uint64_t least = 0;
  std::uint64_t most = std::uint64_t{1} << 53;
};

// One setting that the daemon reads, in its own domain.
struct KnownSetting {
  using Value = std::variant<std::monostate, bool, std::uint64_t>;

  std::string_view key;  // with `isPrefix` the beginning of several keys
  SettingKind kind;
  Value registered;  // without anybody's word; monostate: none
  std::string_view meaning;
  SettingRange range = {};
  bool isPrefix = false;
};

inline constexpr std::monostate kNotRegistered;

// All of them, in the order of their keys: what is registered, read (`SettingsStore.h`), taken at
// the door and told in docs/settings.md follows from here.
inline constexpr KnownSetting kKnownSettings[] = {
    {"TraceEnabled", SettingKind::Boolean, kNotRegistered,
     "operations leave trace events in the kernel's `trace_marker`; read at the start"},
    {"ZLKBagURL", SettingKind::Text, kNotRegistered,
     "where the bag is fetched from, instead of the address that the build was given; a change "
     "counts from the next fetch"},
    {"ZLKDebugParameters", SettingKind::Text, kNotRegistered,
     "`name=value&name=value`: query items that most requests get besides their own; read at the "
     "start"},
    {"ZLKLocationAuthorization", SettingKind::Choice, kNotRegistered,
     "the user's answer about location; read before the device profile's, save that 1 or 2 (no) "
     "from either wins; counts at once",
     SettingRange{0, 4}},
    {"ZLKLogPrivateData", SettingKind::Boolean, false,
     "texts that people typed, headers, identifiers and coordinates show in the log instead of "
     "`<private>`; counts at once"},
    {"ZLKMaximumBagSize", SettingKind::Bytes, std::uint64_t{1'048'576},
     "a larger bag is an error (-1103) and the old one stays"},
    {"ZLKMaximumResourceSize", SettingKind::Bytes, std::uint64_t{268'435'456},
     "for downloads of resources; nothing reads it yet"},
    {"ZLKMaximumResponseSize", SettingKind::Bytes, std::uint64_t{8'388'608},
     "a larger response is an error (-1103)"},
    {"ZLKNoParallax", SettingKind::Boolean, kNotRegistered,
     "no TCP fast open and no TLS session tickets; read at the start"},
    {"ZLKNoQueryCache", SettingKind::Boolean, kNotRegistered,
     "no answers out of the query cache; read for each client identifier when it first comes"},
    {"ZLKPersistSessions", SettingKind::Boolean, kNotRegistered,
     "client identifiers and user agents are kept over restarts; read at the start"},
    {"ZLKSessionMaxAge", SettingKind::Seconds, std::uint64_t{172'800},
     "a stored feedback session that is older goes; read at the start"},
    {"ZLKSessionSizeLimit", SettingKind::Bytes, std::uint64_t{2'097'152},
     "no file of a feedback session reaches it; read at the start"},
    {"ZLKSharedSession", SettingKind::Boolean, true,
     "all clients share one feedback session and one user identifier; read at the start"},
    {"ZLKUseMorvane", SettingKind::Boolean, true,
     "requests may go through the bag's routing proxy where the device profile switches it on; "
     "counts at once"},
    {"ZelkorFirstUseOfTheDay_", SettingKind::Date, kNotRegistered,
     "when that client was last used for the first time of a day; the daemon's own", SettingRange{},
     true},
    {"sessions", SettingKind::List, kNotRegistered,
     "the clients that `ZLKPersistSessions` keeps; the daemon's own"},
};

// A key of the table that is of that kind: another one does not compile.
template <SettingKind kKind>
class SettingKey {
 public:
  consteval SettingKey(const char* key) : SettingKey(std::string_view(key)) {}
  consteval SettingKey(std::string_view key) : row_(_rowOf(key)) {}

  constexpr const KnownSetting& row() const { return *row_; }

 private:
  static consteval const KnownSetting* _rowOf(std::string_view key) {
    for (const auto& row : kKnownSettings) {
      if (row.key == key && row.kind == kKind && !row.isPrefix) return &row;
    }
    _theTableHasNoSuchSettingOfThisKind();
    return nullptr;
  }
  static void _theTableHasNoSuchSettingOfThisKind();

  const KnownSetting* row_;
};

// The registered value of a setting that has one.
consteval std::uint64_t registeredBytes(SettingKey<SettingKind::Bytes> key) {
  return std::get<std::uint64_t>(key.row().registered);
}

// Null for a key that the daemon never reads.
const KnownSetting* knownSetting(std::string_view key);
// The values that are registered.
json::object registeredSettings();
// What that setting's value is, for people.
std::string kindText(const KnownSetting& setting);
// Why nobody may write that value (null: take the key away) in the daemon's own domain; none: it
// may be written.
std::optional<std::string> settingRefusal(std::string_view key, const json::value* value);

}  // namespace zelkord
