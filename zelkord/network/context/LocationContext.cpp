#include "zelkord/network/context/LocationContext.h"

#include <fmt/core.h>

#include <cmath>

namespace zelkord {
namespace {

std::string coordinates(double latitude, double longitude) {
  return fmt::format("{:.6f},{:.6f}", latitude, longitude);
}

// Toward zero; never "-0".
double wholeDegrees(double degrees) { return std::trunc(degrees) + 0.0; }

}  // namespace

std::string_view locationSourceOfType(int type) {
  switch (type) {
    case 1:
    case 2:
    case 3:
    case 9:
      return "gps";
    case 4:
    case 5:
      return "wifi";
    case 6:
    case 7:
    case 8:
      return "cell";
    default:
      return "unknown";
  }
}

LocationNeed LocationContext::need(SteadyTime now) const {
  if (!hasManager) return LocationNeed::Nothing;
  if (fix) return now - fix->time < kFixLifetime ? LocationNeed::Nothing : LocationNeed::Ask;
  return source == kNoFixYet ? LocationNeed::MarkSlowAndAsk : LocationNeed::Ask;
}

bool LocationContext::setLocationIfAllowedByBag(const LocationFix& latest) {
  const auto name = locationSourceOfType(latest.type);
  if (!supportedSources.contains(std::string(name))) {
    setNoLocationWithReason(fmt::format("{}.{}", kBagSaidNo, name));
    return false;
  }
  setLocation(latest, name);
  return true;
}

void LocationContext::setLocation(const LocationFix& latest, std::string_view sourceName) {
  fix = latest;
  latLng = coordinates(latest.latitude, latest.longitude);
  source = fmt::format("{},{:.6f}", sourceName, latest.horizontalAccuracy);
  if (lookupLatLng.empty()) {
    lookupLatLng = coordinates(wholeDegrees(latest.latitude), wholeDegrees(latest.longitude));
  }
}

void LocationContext::setNoLocationWithReason(std::string_view reason) {
  fix.reset();
  latLng.clear();
  lookupLatLng.clear();
  source = reason;
}

void LocationContext::setPerformedSearch() {
  if (fix) lookupLatLng = latLng;
}

}  // namespace zelkord
