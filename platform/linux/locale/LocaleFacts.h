#pragma once

#include "platform/api/LocaleService.h"
#include "platform/linux/device_profile/DeviceProfile.h"
#include "platform/linux/locale/HostLocale.h"

namespace zelkord {

// The locale as services ask for it: the profile's choices over the host's, completed by ICU. Takes
// milliseconds.
LocaleSnapshot localeFacts(const DeviceProfile& profile, const HostLocale& host);

}  // namespace zelkord
