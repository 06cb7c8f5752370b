#pragma once

#include <functional>
#include <string>
#include <vector>

#include "platform/api/DeviceProperties.h"
#include "platform/api/FileManager.h"
#include "platform/linux/device_profile/DeviceProfile.h"

namespace zelkord {

// Device properties: the profile's, else the host's. Read once, at construction.
//
// Threading: any thread.
class LinuxDevice final : public DeviceProperties {
 public:
  struct Host {
    // The computer's model, empty when unknown; asked only when the profile does not say it.
    std::function<std::string()> hardwareModel;
    std::vector<std::string> osReleasePaths = {"/etc/os-release", "/usr/lib/os-release"};
  };

  LinuxDevice(const DeviceProfile& profile, const Host& host, FileManager& files);

  std::string productType() const override { return productType_; }
  std::string productName() const override { return productName_; }
  std::string buildVersion() const override { return buildVersion_; }

 private:
  std::string productType_;
  std::string productName_;
  std::string buildVersion_;
};

}  // namespace zelkord
