#pragma once

#include "base/Namespace.h"

namespace zelkor {

// The user's settings in the state directory: an SQLite database that the daemon writes, and that
// tools may open while no daemon runs. Values are JSON texts; the daemon's own domain is its
// service name.
inline constexpr const char* kSettingsFileName = "defaults.db";
inline constexpr const char* kSettingsSchema =
    "CREATE TABLE IF NOT EXISTS defaults("
    "domain TEXT NOT NULL, key TEXT NOT NULL, value TEXT NOT NULL, PRIMARY KEY(domain, key)) "
    "WITHOUT ROWID";

}  // namespace zelkor
