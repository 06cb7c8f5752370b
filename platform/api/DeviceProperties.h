#pragma once

#include <string>

#include "base/Namespace.h"

namespace zelkord {

// Read once at start.
// Answers from memory, on any thread.
class DeviceProperties {
 public:
  virtual ~DeviceProperties() = default;
  virtual std::string productType() const = 0;
  virtual std::string productName() const = 0;
  virtual std::string buildVersion() const = 0;
};

}  // namespace zelkord
