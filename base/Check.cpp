#include "base/Check.h"

#include <cstdio>
#include <cstdlib>

namespace zelkor {

void failCheck(const char* text, const char* unit) {
  std::fprintf(stderr, "assertion failed: %s (%s)\n", text, unit);
  std::abort();
}

}  // namespace zelkor
