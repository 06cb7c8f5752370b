#pragma once

#include <memory>

#include "platform/api/Clock.h"
#include "platform/api/Log.h"
#include "platform/linux/bus/BusThread.h"
#include "platform/linux/location/LocationSource.h"

namespace zelkord {

// Fixes from GeoClue2 over the system bus.
//
// States: asking for a client; configuring it; started; ended, when GeoClue refuses, is not there
// or leaves, or the bus does: a new source has to be made then. Each signal that the location
// changed is followed by a read of the new location.
//
// Threading: call-backs run on the bus thread. Destroying waits for the one that runs, so not from
// within one. Errors: a refusal is told as a failure.
class GeoClueSource final : public LocationSource {
 public:
  // Null without a system bus. `missing` runs when GeoClue turns out not to be there, or leaves.
  static std::unique_ptr<LocationSource> make(const LocationOptions& options,
                                              LocationSourceEvents events, const Clock& clock,
                                              std::function<void(const std::string&)> missing);
  ~GeoClueSource() override;

 private:
  GeoClueSource(BusConnection bus, const LocationOptions& options, LocationSourceEvents events,
                const Clock& clock, std::function<void(const std::string&)> missing);

  struct Callbacks;
  void _begin();
  void _gotClient(sd_bus_message* reply);
  void _locationUpdated(sd_bus_message* signal);
  void _gotLocation(sd_bus_message* reply);
  void _ownerChanged(sd_bus_message* signal);
  // True when the reply is an error, which ends this; tells what it means.
  bool _failed(sd_bus_message* reply);
  void _endMissing(const std::string& problem);

  const LocationOptions options_;
  const LocationSourceEvents events_;
  const Clock& clock_;
  const std::function<void(const std::string&)> missing_;
  std::string client_;  // object path; of the bus thread
  BusThread thread_;
};

// The type of a fix of that accuracy in metres: satellite, wireless network, cell.
int locationTypeOfAccuracy(double metres);

// GeoClue's accuracy level for a wish in metres: 8 exact, 6 street, 5 neighbourhood, 4 city.
unsigned geoClueAccuracyLevel(double metres);

}  // namespace zelkord
