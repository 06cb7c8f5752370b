#pragma once

#include "platform/api/DeviceProperties.h"

namespace zelkord {

// Device properties that a test sets before it builds on them.
class FakeDevice final : public DeviceProperties {
 public:
  std::string type = "Phone1,1";
  std::string name = "TestOS";
  std::string build = "1A234";

  std::string productType() const override { return type; }
  std::string productName() const override { return name; }
  std::string buildVersion() const override { return build; }
};

}  // namespace zelkord
