#include <cstddef>
#include <cstdint>
#include <string_view>
#include <vector>

#include "base/Check.h"
#include "platform/linux/device_profile/DeviceProfile.h"

// Any bytes as a device profile: it parses, says the same twice, and every value that is taken over
// is one that the daemon may use.
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace zelkord;
  const std::string_view text(reinterpret_cast<const char*>(data), size);
  std::vector<std::string> problems;
  const auto profile = parseDeviceProfile(text, problems);
  std::vector<std::string> again;
  ZK_CHECK(parseDeviceProfile(text, again) == profile && again == problems, "parses differently");
  ZK_CHECK(notificationsForChange(profile, profile, "en_US").empty(), "a change without one");
  (void)notificationsForChange({}, profile, "en_US");
  if (profile.location) {
    ZK_CHECK(profile.location->type >= 1 && profile.location->type <= 9, "location type");
  }
  if (profile.country) ZK_CHECK(profile.country->size() == 2, "country");
  if (profile.screenScale) ZK_CHECK(*profile.screenScale >= 0, "screen scale");
  return 0;
}
