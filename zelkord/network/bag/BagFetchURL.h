#pragma once

#include <string>
#include <string_view>

#include "platform/api/SettingsStore.h"

namespace zelkord {

inline constexpr std::string_view kBagURLSetting = "ZLKBagURL";

struct BagFetchURL {
  std::string url;
  bool settingIsMalformed = false;  // the setting is no URL, and so does not count
};

// Where a device in that country (ISO code, any case) gets the bag from: what the setting says,
// else the address that the build was given.
BagFetchURL bagFetchURL(const SettingsStore& settings, std::string_view country);

}  // namespace zelkord
