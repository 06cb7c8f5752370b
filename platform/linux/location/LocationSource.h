#pragma once

#include <functional>
#include <memory>

#include "platform/api/LocationService.h"

namespace zelkord {

// A provider of fixes, running from its making to its end. Its call-backs come on a thread of its
// own.
class LocationSource {
 public:
  virtual ~LocationSource() = default;
};

struct LocationSourceEvents {
  std::function<void(const LocationFix&)> fix;
  std::function<void(const Error&)> failure;
  // No fix will come any more: the provider has refused, gone or never been there.
  std::function<void()> ended;
};

// Null when the host has no such provider.
using LocationSourceFactory = std::function<std::unique_ptr<LocationSource>(
    const LocationOptions& options, LocationSourceEvents events)>;

}  // namespace zelkord
