#include "platform/linux/device/LinuxDevice.h"

#include "base/Text.h"
#include "platform/linux/device/OsRelease.h"

namespace zelkord {
namespace {

constexpr std::uint64_t kMaximumOsRelease = 64 * 1024;

std::map<std::string, std::string> readOsRelease(const std::vector<std::string>& paths,
                                                 FileManager& files) {
  for (const auto& path : paths) {
    Error error;
    if (const auto text = files.read(path, kMaximumOsRelease, &error)) return parseOsRelease(*text);
  }
  return {};
}

// The first that is fit for a header.
std::string firstUsable(std::initializer_list<std::string> texts) {
  for (const auto& text : texts) {
    if (!text.empty() && isValidUtf8(text) && !hasControlCharacters(text)) return text;
  }
  return "";
}

}  // namespace

LinuxDevice::LinuxDevice(const DeviceProfile& profile, const Host& host, FileManager& files) {
  auto release = readOsRelease(host.osReleasePaths, files);
  productType_ = profile.productType
                     ? *profile.productType
                     : firstUsable({host.hardwareModel ? host.hardwareModel() : "", "Linux"});
  productName_ = profile.productName.value_or(firstUsable({release["NAME"], "Linux"}));
  buildVersion_ =
      profile.buildVersion.value_or(firstUsable({release["BUILD_ID"], release["VERSION_ID"]}));
}

}  // namespace zelkord
