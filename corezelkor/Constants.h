#pragma once

#include <string_view>

#include "base/Namespace.h"

namespace zelkor {

// The names that the daemon and its clients share.
inline constexpr std::string_view kServiceName = "com.quenta.zelkord";
inline constexpr std::string_view kObjectPath = "/com/quenta/zelkord";
inline constexpr std::string_view kClientObjectPath = "/com/quenta/zelkord/client";
inline constexpr std::string_view kDaemonInterface = "com.quenta.zelkord.Daemon1";
inline constexpr std::string_view kClientInterface = "com.quenta.zelkord.Client1";
inline constexpr std::string_view kEndpointInterface = "com.quenta.zelkord.Endpoint1";
inline constexpr std::string_view kDiagnosticsInterface = "com.quenta.zelkord.Diagnostics1";

inline constexpr std::string_view kZLKZelkordNameVersion = "Zelkord/1.0";
inline constexpr std::string_view kZLKNotifyEnabled = "com.quenta.zelkord.news.enabled";
inline constexpr std::string_view kZLKNotifyDisabled = "com.quenta.zelkord.news.disabled";
inline constexpr std::string_view kZLKLookupHintsWeekly = "lookup_hints_weekly";
inline constexpr std::string_view kZLKLookupHintsMonthly = "lookup_hints_monthly";
inline constexpr std::string_view kZLKInstalledAppWhitelist = "installed_app_whitelist";
inline constexpr std::string_view kZLKCrowdsourcingWhitelist = "crowdsourcing_whitelist";
inline constexpr std::string_view kZLKCrowdsourcingBlacklist = "crowdsourcing_blacklist";
inline constexpr std::string_view kNewsAppIdentifier = "com.quenta.news";
inline constexpr std::string_view kHashtagImagesExtensionIdentifier =
    "com.quenta.messages.hashtagimages";

}  // namespace zelkor
