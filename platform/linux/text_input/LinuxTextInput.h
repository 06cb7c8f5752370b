#pragma once

#include <string>

#include "platform/api/LocaleService.h"
#include "platform/api/TextInputService.h"
#include "platform/linux/device_profile/DeviceProfileStore.h"

namespace zelkord {

// Text input and screen, as the device profile describes them; the input mode of a profile without
// one is the locale. Any thread; everything given outlives it.
class LinuxTextInput final : public TextInputService {
 public:
  LinuxTextInput(const DeviceProfileStore& store, const LocaleService& locale)
      : store_(store), locale_(locale) {}

  std::string currentInputMode() const override {
    const auto profile = store_.current();
    return profile->keyboardInputMode ? *profile->keyboardInputMode : locale_.current().identifier;
  }
  double mainScreenScale() const override { return store_.current()->screenScale.value_or(1.0); }

 private:
  const DeviceProfileStore& store_;
  const LocaleService& locale_;
};

}  // namespace zelkord
