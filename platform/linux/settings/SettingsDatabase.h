#pragma once

#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "platform/api/Log.h"
#include "platform/linux/settings/SettingsLayers.h"
#include "platform/linux/sqlite/Database.h"

namespace zelkord {

// The user's settings on disk: table defaults(domain, key, value), the value as JSON text.
//
// States: open; or closed, when the file cannot be opened. A damaged file is renamed and a new one
// takes its place, whether that shows at opening or at a write.
//
// Threading: one thread at a time. Errors: see each operation; nothing is logged twice in a row.
class SettingsDatabase final {
 public:
  // A value to store, or null to remove the row.
  struct Change {
    std::string domain;
    std::string key;
    std::optional<std::string> json;
  };

  // `busyTimeout` is for how long a lock that somebody else holds is waited for.
  SettingsDatabase(std::string path, Logger log, Duration busyTimeout);

  // Everything that is stored. Rows that do not parse are left out.
  SettingsByDomain load();
  // Stores the changes, all or none. False when that failed; the caller keeps them and tries again
  // later. `everything` gives all values there are, for a file that has to be made anew.
  bool store(const std::vector<Change>& changes, FunctionRef<std::vector<Change>()> everything);

 private:
  std::optional<sqlite::Failure> _open();
  std::optional<sqlite::Failure> _readInto(SettingsByDomain& settings);
  std::optional<sqlite::Failure> _write(const std::vector<Change>& changes);
  void _replaceDamaged(const sqlite::Failure& failure);
  void _complain(const char* what, const sqlite::Failure& failure);

  const std::string path_;
  const Logger log_;
  const Duration busyTimeout_;
  std::optional<sqlite::Database> database_;
  std::string lastComplaint_;
};

}  // namespace zelkord
