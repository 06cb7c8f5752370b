#pragma once

#include <optional>
#include <set>
#include <string>
#include <string_view>

#include "base/Time.h"
#include "platform/api/LocationService.h"

namespace zelkord {

// Why a request has no location, where it would say the source of one.
inline constexpr std::string_view kUserSaidNo = "userno";          // not authorised
inline constexpr std::string_view kNoFixYet = "error.init";        // none since start
inline constexpr std::string_view kFixIsSlow = "slow";             // a request did not wait for it
inline constexpr std::string_view kLocationFailed = "error.fail";  // the service said so
inline constexpr std::string_view kBagSaidNo = "bagno";            // + "." + source
inline constexpr std::string_view kBagSaidNoToAll = "bagno.all";

// How old a fix may get before a request asks for another.
inline constexpr Duration kFixLifetime = 300s;

// What a request that is about to be built does about the location first.
enum class LocationNeed {
  Nothing,        // there is a young fix, or nobody to ask
  Ask,            // ask for a fix, which later requests use
  MarkSlowAndAsk  // also say that this request did not wait for the first one
};

// What requests say about where the device is.
//
// States: no location, with a reason in `source`; or a fix, with its coordinates and source.
// `lookupLatLng` keeps what it was first set to (whole degrees) until the user searches, or the
// location is lost.
struct LocationContext {
  std::set<std::string> supportedSources;  // that the bag allows
  bool hasManager = false;
  std::optional<LocationFix> fix;
  std::string latLng;        // "%f,%f"; empty without a fix
  std::string source;        // "%@,%f" (source, accuracy in metres), or the reason
  std::string lookupLatLng;  // "%f,%f"; empty without a fix

  LocationNeed need(SteadyTime now) const;
  // A fix that the bag's sources allow is taken; any other one makes the location unknown. Whether
  // it was taken.
  bool setLocationIfAllowedByBag(const LocationFix& latest);
  void setNoLocationWithReason(std::string_view reason);
  void setPerformedSearch();

 private:
  void setLocation(const LocationFix& latest, std::string_view sourceName);
};

// "gps", "cell", "wifi" or "unknown".
std::string_view locationSourceOfType(int type);

}  // namespace zelkord
