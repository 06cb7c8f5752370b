#pragma once

#include <array>
#include <span>
#include <string>
#include <string_view>

#include "sandbox/http/Message.h"

namespace sandbox {

// Names of the files that the bag lists for download.
std::span<const std::string_view> resourceNames();

// Their common version.
std::string_view resourceVersion();

// The files under /resource/.
//
// /resource/NAME gives the file; the two lookup-hints files depend on where the device is, and
// redirect to /resource/PERIOD/VERSION/PLACE, whose entity tag "VERSION-PLACE-PERIOD" is the file's
// "signature". Threading: any thread. Errors: an unknown path gives a 404.
class Resources final {
 public:
  explicit Resources(std::string baseUrl) : baseUrl_(std::move(baseUrl)) {}

  // `request.path` begins with "/resource/".
  Reply answer(const Request& request) const;

 private:
  Reply _redirectToHints(const Request& request, std::string_view period) const;

  const std::string baseUrl_;
};

// "n48e011" for "48.137,11.575"; "world" for anything that is not a place.
std::string placeOf(std::string_view latitudeAndLongitude);

}  // namespace sandbox
