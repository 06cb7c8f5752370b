#pragma once

#include "platform/api/AccountService.h"
#include "platform/linux/device_profile/DeviceProfileStore.h"

namespace zelkord {

// The primary account, as the device profile describes it. Any thread; the store outlives it.
class LinuxAccounts final : public AccountService {
 public:
  explicit LinuxAccounts(const DeviceProfileStore& store) : store_(store) {}

  bool primaryAccountIsManaged() const override {
    return store_.current()->managedAccount.value_or(false);
  }

 private:
  const DeviceProfileStore& store_;
};

}  // namespace zelkord
