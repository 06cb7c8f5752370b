#pragma once

#include <atomic>
#include <memory>
#include <string_view>
#include <vector>

#include "base/Mutex.h"
#include "base/Subscription.h"
#include "zelkord/network/context/RequestContextStore.h"

namespace zelkord {

class Assembly;
class DeviceManagement;

// Fills the request context from the host's services, and again when the host announces a change.
// A change of country or locale asks for a look at the bag.
//
// Country, locale and time zone often change together and are announced one after the other: the
// first announcement takes over all three in one update, so that no request, and no look at the
// bag, falls in between.
//
// Threading: `start` once, on any thread; observers run on the thread of whoever posts.
// Ownership: the assembly outlives it. `poster` is only an identity: the object of what it posts.
class ContextUpdater final : public std::enable_shared_from_this<ContextUpdater> {
 public:
  ContextUpdater(Assembly& assembly, std::shared_ptr<RequestContextStore> context,
                 const void* poster);

  void start();

 private:
  // Why an update happens.
  enum class Cause { Start, Notification };
  using Update = void (ContextUpdater::*)(Cause);

  void _setup(std::initializer_list<std::string_view> notifications, Update update);
  void _updateDeviceCountryCode(Cause cause);
  void _updateMapsClientMetadata(Cause cause);
  void _updateLocaleContexts(Cause cause);
  void _updateTimeZoneName(Cause cause);
  // False when the languages cannot be encoded and were left out.
  bool _takeOverPlaceAndLocale();
  void _updateIsManagedAccount(Cause cause);
  void _updateDeviceRestrictions(Cause cause);
  void _setupDebuggingQueryItems();
  void _notifyBagRefreshRequired();
  void _postBagRefreshRequired();

  // Fixed after construction; the observers after start.
  Assembly& assembly_;
  const std::shared_ptr<RequestContextStore> context_;
  const void* const poster_;
  std::vector<Subscription> observers_;

  // Own synchronisation.
  Mutex takingOver_;  // what is read last is what the context is given last
  std::atomic<bool> refreshIsOnItsWay_ = false;
};

// Whether the restrictions keep the user from the stores.
bool deviceIsRestricted(const DeviceManagement& management);

}  // namespace zelkord
