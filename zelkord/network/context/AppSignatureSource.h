#pragma once

#include <optional>
#include <string>

#include "base/Namespace.h"

namespace zelkord {

// The signature of the installed applications that the service asks about. Any thread, from memory:
// it is read while a request is built.
class AppSignatureSource {
 public:
  virtual ~AppSignatureSource() = default;
  virtual std::optional<std::string> signature() const = 0;
};

}  // namespace zelkord
