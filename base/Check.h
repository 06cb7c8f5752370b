#pragma once

#include "base/Export.h"
#include "base/Namespace.h"

namespace zelkor {

// Prints "assertion failed: TEXT (UNIT)" to standard error and aborts.
[[noreturn]] ZK_EXPORT void failCheck(const char* text, const char* unit);

}  // namespace zelkor

// A broken invariant of our own code stops the process, in every build.
#define ZK_CHECK(condition, text)                          \
  do {                                                     \
    if (!(condition)) ::zelkor::failCheck(text, __FILE__); \
  } while (false)
