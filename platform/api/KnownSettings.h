#pragma once

#include <span>
#include <string_view>

#include "base/Json.h"

namespace zelkord {

// What a setting's value is. A value of another kind counts as absent.
enum class SettingKind { Boolean, Text, Bytes, Seconds, Authorization, Date, List };

// One setting that the daemon reads, in its own domain.
struct KnownSetting {
  std::string_view key;  // with `isPrefix` the beginning of several keys
  SettingKind kind;
  std::string_view registered;  // the value without anybody's word, as JSON; empty: none
  std::string_view meaning;
  bool isPrefix = false;
};

// All of them, in the order of their keys. docs/settings.md lists the same.
std::span<const KnownSetting> knownSettings();
// Null for a key that the daemon never reads.
const KnownSetting* knownSetting(std::string_view key);
// The values that are registered.
json::object registeredSettings();
std::string_view nameOf(SettingKind kind);

}  // namespace zelkord
