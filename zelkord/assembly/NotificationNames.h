#pragma once

#include <string_view>

#include "base/Namespace.h"

namespace zelkord {

// The daemon's own notifications, posted in its notification centre. No object and no user info
// unless said.

// A bag was installed: user info "bag", a std::shared_ptr<const ZLKBag>. Or a fetch failed:
// "bagError", an Error. Services of the daemon observe InstalledBag instead, which posts this in
// its exclusive task: observers use the bag in the user info, ask neither it nor the controller
// anything, and wait for no queue whose tasks may ask them.
inline constexpr std::string_view kZLKBagChangeNotification = "ZLKBagChangeNotification";
// Something that the bag depends on changed. Object: the request factory, as a BagRequests.
inline constexpr std::string_view kZLKBagRefreshRequired = "ZLKBagRefreshRequired";
inline constexpr std::string_view kZLKUserGUIDChangeNotification = "ZLKUserGUIDChangeNotification";
inline constexpr std::string_view kZLKSessionSoftLimitNotification =
    "ZLKSessionSoftLimitNotification";
inline constexpr std::string_view kZLKSessionMaxLimitNotification =
    "ZLKSessionMaxLimitNotification";
// Every service has been made.
inline constexpr std::string_view kZLKStartup = "ZLKStartup";

}  // namespace zelkord
