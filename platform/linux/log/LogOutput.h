#pragma once

#include <string_view>

#include "base/Time.h"
#include "platform/api/Log.h"

namespace zelkord {

// One place that log entries go to.
// Threading: any thread. Errors: an entry that cannot be written is lost; nothing throws.
class LogOutput {
 public:
  virtual ~LogOutput() = default;
  virtual void write(WallTime time, LogLevel level, std::string_view category,
                     std::string_view text) = 0;
  virtual void flush() = 0;
};

}  // namespace zelkord
