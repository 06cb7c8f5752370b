#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "base/Error.h"
#include "base/Time.h"
#include "platform/api/WorkQueue.h"

namespace zelkord {

// 0 not determined, 1 restricted, 2 denied, 3 and 4 authorised.
using LocationAuthorization = int;

struct LocationFix {
  double latitude = 0;
  double longitude = 0;
  double horizontalAccuracy = 0;  // metres
  int type = 0;                   // 1, 2, 3, 9 satellite; 6, 7, 8 cell; 4, 5 wireless network
  SteadyTime time{};
};

// Call-backs arrive on the queue given to makeManager.
class LocationDelegate {
 public:
  virtual ~LocationDelegate() = default;
  virtual void didUpdateLocations(const std::vector<LocationFix>& fixes) = 0;
  virtual void didChangeAuthorizationStatus(LocationAuthorization status) = 0;
  virtual void didFailWithError(const Error& error) = 0;
};

// One user of the location service. Destroying it stops it; no call-back begins after that.
class LocationManager {
 public:
  virtual ~LocationManager() = default;
  virtual void startUpdating() = 0;
  virtual void stopUpdating() = 0;
};

struct LocationOptions {
  double desiredAccuracy = 1000;  // metres
  bool dynamicAccuracyReduction = true;
};

// Where the device is, for the bundle that the user authorises. Any thread.
class LocationService {
 public:
  virtual ~LocationService() = default;
  virtual bool isEnabledSystemWide() const = 0;
  virtual LocationAuthorization authorization(const std::string& bundlePath) const = 0;
  virtual void setAuthorization(const std::string& bundlePath, LocationAuthorization status) = 0;
  virtual std::unique_ptr<LocationManager> makeManager(const std::string& bundlePath,
                                                       const LocationOptions& options,
                                                       std::weak_ptr<LocationDelegate> delegate,
                                                       WorkQueue& queue) = 0;
};

}  // namespace zelkord
