#pragma once

#include <optional>
#include <string>

#include "base/Error.h"
#include "platform/linux/system/Descriptor.h"

namespace zelkord {

// The claim of one daemon on a state directory, held until it is destroyed or the process ends,
// however it ends.
class StateLock final {
 public:
  // None on failure; `error` then has the reason: EWOULDBLOCK when another daemon holds it
  // ("already running: process PID uses DIRECTORY").
  static std::optional<StateLock> acquire(const std::string& directory, Error* error);

 private:
  explicit StateLock(Descriptor file) : file_(std::move(file)) {}

  Descriptor file_;
};

}  // namespace zelkord
