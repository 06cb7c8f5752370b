#pragma once

#include <sys/types.h>

#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "base/Namespace.h"

namespace zelkor {

// What the runtime directory depends on; `environment` gives a variable's value.
struct RuntimeEnvironment {
  std::function<std::optional<std::string>(const std::string& name)> environment;
  uid_t user = 0;
  std::string runtimeRoot = "/run/user";  // of the directories that logind makes

  static RuntimeEnvironment ofProcess();
};

// Where the daemon of this user may have its runtime directory, likeliest first; it and its clients
// go by the same list. XDG_RUNTIME_DIR alone when it is an absolute path; else /run/user/UID alone
// when that is ours; else what is there of the temporary directory's zelkord-UID and
// zelkord-UID.SUFFIX, as far as they are directories of our own that nobody else may enter.
std::vector<std::string> findRuntimeDirectories(const RuntimeEnvironment& environment);

// For the daemon: the first of them, else a new one under the temporary directory. Its name is not
// the usual one when somebody took that.
std::string makeRuntimeDirectory(const RuntimeEnvironment& environment);

// The absolute path in a variable, without slashes at its end; a relative one counts as unset.
std::optional<std::string> absolutePathIn(const RuntimeEnvironment& environment,
                                          const std::string& name);

}  // namespace zelkor
