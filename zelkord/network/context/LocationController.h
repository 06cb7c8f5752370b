#pragma once

#include <atomic>
#include <memory>
#include <string_view>
#include <vector>

#include "base/Guarded.h"
#include "platform/api/LocationService.h"
#include "platform/api/WorkQueues.h"
#include "zelkord/network/context/RequestContextStore.h"

namespace zelkord {

class Assembly;

// What the user authorises to know where the device is.
inline constexpr std::string_view kLocationBundlePath =
    "/System/Library/LocationBundles/CoreZelkor.framework";

// Keeps the location of the request context: asks the location service for a fix when a request
// could use one, and stops asking once it has one.
//
// States: no location manager (before the first bag, or when that bag allows no source); a manager
// that rests; one that updates, until it brings a fix that the bag allows.
//
// Threading: public operations on any thread; call-backs of the location service on the main queue.
// The manager is made on the main queue, started and stopped on `locationQueue_`.
// Ownership: the assembly outlives it.
// Errors: a failure of the location service is logged and becomes the reason for no location.
class LocationController final : public LocationDelegate,
                                 public std::enable_shared_from_this<LocationController> {
 public:
  LocationController(Assembly& assembly, std::shared_ptr<RequestContextStore> context);

  // Once, at start: grants what nobody has decided, and sets the first reason for no location.
  void initLocationServices();
  // Once, when the first bag has come: makes the manager if that bag allows any source.
  void setupLocationServices(bool anySourceAllowed);
  // A request is about to be built: asks for a fix unless there is a young one.
  void startUpdatingLocation();
  // Asks for a fix on behalf of a request. Does nothing without a manager, and within a second of
  // the request before: the manager is still at it.
  void askForFix();

  void didUpdateLocations(const std::vector<LocationFix>& fixes) override;
  void didChangeAuthorizationStatus(LocationAuthorization status) override;
  void didFailWithError(const Error& error) override;

 private:
  void _setupLocationServices(bool anySourceAllowed);
  void _makeManager();
  void _dropManager();
  void _startManager();
  void _stopUpdatingLocation();
  void _onManager(void (LocationManager::*operation)());
  void _setNoLocationWithReason(std::string_view reason);

  // Fixed after construction.
  Assembly& assembly_;
  const std::shared_ptr<RequestContextStore> context_;

  // Own synchronisation.
  Guarded<std::shared_ptr<LocationManager>> manager_;
  std::atomic<SteadyTime> nextAsk_{SteadyTime::min()};

  const std::unique_ptr<SerialQueue> locationQueue_;
};

}  // namespace zelkord
