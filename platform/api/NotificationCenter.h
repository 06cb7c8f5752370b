#pragma once

#include <any>
#include <functional>
#include <map>
#include <memory>
#include <string>
#include <string_view>

#include "base/Namespace.h"
#include "base/Subscription.h"

namespace zelkord {

struct Notification {
  std::string name;
  const void* object = nullptr;  // who posted it; may be null
  std::map<std::string, std::any, std::less<>> userInfo;

  // The user-info value of that key when it has the type, else null.
  template <typename T>
  const T* value(std::string_view key) const {
    const auto found = userInfo.find(key);
    return found == userInfo.end() ? nullptr : std::any_cast<T>(&found->second);
  }
};

// In-process broadcasts by name.
//
// Threading: any thread. Observers run on the poster's thread, in the order in which they
// registered, before `post` returns; they may observe, cancel and post in turn.
class NotificationCenter final {
 public:
  using Observer = std::function<void(const Notification&)>;

  NotificationCenter();
  ~NotificationCenter();

  // With `object`, only notifications posted with that object.
  Subscription observe(std::string name, Observer observer, const void* object = nullptr);
  void post(const Notification& notification);
  void post(std::string name) { post(Notification{std::move(name), nullptr, {}}); }

 private:
  struct State;
  std::shared_ptr<State> state_;
};

// What the host announces through the centre; each has no object and no user info.
inline constexpr std::string_view kCountryCodeChanged = "PlatformCountryCodeChangedNotification";
inline constexpr std::string_view kMapsClientMetadataInvalidated =
    "PlatformMapsClientMetadataInvalidatedNotification";
inline constexpr std::string_view kCurrentLocaleChanged =
    "PlatformCurrentLocaleChangedNotification";
inline constexpr std::string_view kTimeZoneChanged = "PlatformTimeZoneChangedNotification";
inline constexpr std::string_view kAccountStoreChanged = "PlatformAccountStoreChangedNotification";
inline constexpr std::string_view kAccountCredentialsChanged =
    "PlatformAccountCredentialsChangedNotification";
inline constexpr std::string_view kEffectiveRestrictionsChanged =
    "PlatformEffectiveRestrictionsChangedNotification";
inline constexpr std::string_view kStorefrontChanged = "PlatformStorefrontChangedNotification";
inline constexpr std::string_view kSubscriptionsChanged =
    "PlatformSubscriptionsChangedNotification";
inline constexpr std::string_view kNewsAccountStatusChanged =
    "PlatformNewsAccountStatusChangedNotification";

}  // namespace zelkord
